#include <corvane/Upload/Endpoint.h>

#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Error.h>

#include <algorithm>
#include <utility>

namespace corvane {

Endpoint::Endpoint(std::string url, std::string name, std::optional<std::string> sharedContainerIdentifier)
    : url_(std::move(url)), name_(std::move(name)), sharedContainerIdentifier_(std::move(sharedContainerIdentifier)) {
    const bool breaksOut = std::any_of(url_.begin(), url_.end(), [](char c) {
        const auto byte = static_cast<unsigned char>(c);
        return byte <= ' ' || byte == 0x7f;
    });
    if (url_.empty() || breaksOut) {
        throw InvalidArgument("the endpoint URL must not be empty or hold blanks or control characters");
    }
    static_cast<void>(DocumentsDirectory::fileNamePart(name_));
}

Endpoint::~Endpoint() = default;

Endpoint Endpoint::copyOf(const EndpointType& other) {
    return {other.url(), other.name(), other.sharedContainerIdentifier()};
}

}  // namespace corvane
