#pragma once

#include <corvane/Platform/Date.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace replay {

/// One line of an access log in combined log format. Every text is UTF-8. What the log leaves out ("-") is nothing.
struct AccessLogEntry {
    std::string address;  ///< the client's address or host name
    std::optional<std::string> user;
    corvane::Date time;
    std::optional<std::string> method;
    std::optional<std::string> path;  ///< the whole request when it is not one of HTTP
    std::optional<std::string> query;
    std::optional<std::string> protocol;
    std::optional<int> status;
    std::optional<std::int64_t> bytes;
    std::optional<std::string> referrer;
    std::optional<std::string> agent;
};

/// Reads one line, without its line break:
///
///     address ident user [10/Oct/2026:13:55:36 +0200] "request" status bytes "referrer" "agent"
///
/// Inside quotes `\"`, `\\`, `\xHH` and the letters of C (`\n`, `\t`, ...) are escapes; any other backslash stands for
/// itself. Bytes that are not UTF-8 become U+FFFD. Fields after the agent, which many servers add, are ignored. Returns
/// nothing when the line is not of this format.
[[nodiscard]] std::optional<AccessLogEntry> parseAccessLogLine(std::string_view line);

}  // namespace replay
