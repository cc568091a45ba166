#include <corvane/Upload/Endpoint.h>

#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Error.h>

#include <algorithm>
#include <string_view>
#include <utility>

namespace corvane {

namespace {

bool isControlOrBlank(char c) {
    const auto byte = static_cast<unsigned char>(c);
    return byte <= ' ' || byte == 0x7f;
}

// Whether the URL begins with the scheme, in whatever capitals, and names a host.
bool hasScheme(std::string_view url, std::string_view scheme) {
    const auto sameLetter = [](char a, char b) { return (a >= 'A' && a <= 'Z' ? a - 'A' + 'a' : a) == b; };
    return url.size() > scheme.size() &&
           std::equal(scheme.begin(), scheme.end(), url.begin(), [&](char b, char a) { return sameLetter(a, b); }) &&
           url[scheme.size()] != '/';
}

}  // namespace

Endpoint::Endpoint(std::string url, std::string name, std::optional<std::string> sharedContainerIdentifier)
    : Endpoint(std::move(url), std::move(name),
               EndpointOptions{.sharedContainerIdentifier = std::move(sharedContainerIdentifier)}) {}

// The message does not repeat the URL, which may hold a password.
Endpoint::Endpoint(std::string url, std::string name, EndpointOptions options)
    : url_(std::move(url)), name_(std::move(name)), options_(std::move(options)) {
    if (std::any_of(url_.begin(), url_.end(), isControlOrBlank)) {
        throw InvalidArgument("the endpoint URL must not hold blanks or control characters");
    }
    if (!hasScheme(url_, "https://") && !hasScheme(url_, "http://")) {
        throw InvalidArgument("the endpoint URL must be an absolute one that begins with https:// or http://");
    }
    static_cast<void>(DocumentsDirectory::fileNamePart(name_));
    if (!options_.trustedCertificates.empty() && !options_.trustedCertificates.is_absolute()) {
        throw InvalidArgument("the path of the trusted certificates must be absolute");
    }
}

Endpoint::~Endpoint() = default;

Endpoint Endpoint::copyOf(const EndpointType& other) {
    return {other.url(), other.name(),
            EndpointOptions{other.sharedContainerIdentifier(), other.trustedCertificates(), other.headers()}};
}

}  // namespace corvane
