#include <corvane/Transfer/HTTPURL.h>

#include <corvane/Transfer/TransferError.h>

#include <curl/curl.h>

#include <algorithm>
#include <memory>
#include <new>
#include <utility>

namespace corvane {

namespace {

using Code = TransferError::Code;

std::string part(CURLU* url, CURLUPart which) {
    char* text = nullptr;
    if (curl_url_get(url, which, &text, CURLU_DEFAULT_PORT) != CURLUE_OK) return {};
    const std::unique_ptr<char, decltype(&curl_free)> owned(text, curl_free);
    return text;
}

// For messages: a user and a password are nobody's business.
std::string withoutUser(const std::string& url) {
    const auto slashes = url.find("//");
    const auto start = slashes == std::string::npos ? 0 : slashes + 2;
    const auto at = url.rfind('@', url.find_first_of("/?#", start));
    return at == std::string::npos || at < start ? url : url.substr(0, start) + url.substr(at + 1);
}

}  // namespace

std::string inLowerCase(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
    return text;
}

HTTPURL HTTPURL::parse(const std::string& text) {
    const std::unique_ptr<CURLU, decltype(&curl_url_cleanup)> url(curl_url(), curl_url_cleanup);
    if (!url) throw std::bad_alloc();
    if (text.find('\0') != std::string::npos || curl_url_set(url.get(), CURLUPART_URL, text.c_str(), 0) != CURLUE_OK) {
        throw TransferError(Code::invalidRequest, "the URL cannot be used: " + withoutUser(text));
    }
    const std::string scheme = part(url.get(), CURLUPART_SCHEME);
    if (scheme != "http" && scheme != "https") {
        throw TransferError(Code::invalidRequest, "the URL is neither http nor https: " + withoutUser(text));
    }
    return {inLowerCase(part(url.get(), CURLUPART_HOST)), part(url.get(), CURLUPART_PORT)};
}

bool HTTPURL::isLoopback() const {
    return host == "localhost" || host.ends_with(".localhost") || host.starts_with("127.") || host == "[::1]";
}

}  // namespace corvane
