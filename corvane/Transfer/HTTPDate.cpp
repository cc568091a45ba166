#include <corvane/Transfer/HTTPDate.h>

#include <curl/curl.h>

namespace corvane {

std::optional<Date> dateFromHTTP(const std::string& text) {
    const auto seconds = curl_getdate(text.c_str(), nullptr);
    if (seconds < 0) return std::nullopt;
    return dateFromSeconds(static_cast<double>(seconds)).value_or(Date::max());
}

}  // namespace corvane
