#include <corvane/Upload/RetryAfter.h>

#include <corvane/Transfer/HTTPDate.h>

#include <strings.h>

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <string>

namespace corvane {

namespace {

// A number too large for any type is still a number.
std::optional<std::int64_t> secondsOf(const std::string& text) {
    const bool isNumber =
        !text.empty() && std::all_of(text.begin(), text.end(), [](char c) { return c >= '0' && c <= '9'; });
    if (!isNumber) return std::nullopt;
    std::int64_t seconds = longestRetryAfter.count();
    std::from_chars(text.data(), text.data() + text.size(), seconds);
    return seconds;
}

}  // namespace

std::optional<std::chrono::seconds> retryAfter(const UploadResponse& response, Date now) {
    if (response.statusCode != 429 && response.statusCode != 503) return std::nullopt;
    const auto header = std::find_if(response.headers.begin(), response.headers.end(),
                                     [](const auto& one) { return strcasecmp(one.first.c_str(), "Retry-After") == 0; });
    if (header == response.headers.end()) return std::nullopt;
    auto seconds = secondsOf(header->second);
    if (!seconds) {
        const auto date = dateFromHTTP(header->second);
        if (date && *date > now) seconds = (millisecondsBetween(now, *date) + 999) / 1000;
    }
    if (!seconds) return std::nullopt;
    return std::min(std::chrono::seconds(*seconds), longestRetryAfter);
}

}  // namespace corvane
