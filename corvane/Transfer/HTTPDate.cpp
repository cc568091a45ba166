#include <corvane/Transfer/HTTPDate.h>

#include <curl/curl.h>

namespace corvane {

std::optional<Date> dateFromHTTP(const std::string& text) {
    const auto seconds = curl_getdate(text.c_str(), nullptr);
    return seconds < 0 ? std::nullopt : dateFromSeconds(static_cast<double>(seconds));
}

}  // namespace corvane
