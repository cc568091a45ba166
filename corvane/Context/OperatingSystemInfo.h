#pragma once

#include <corvane/Export.h>

#include <optional>
#include <string>

namespace corvane {

/// Data: the operating system, of which many thousands of machines have the same.
struct OperatingSystemInfo {
    std::optional<std::string> identifier;  ///< for programs: "debian"
    std::optional<std::string> name;        ///< for people: "Debian GNU/Linux"
    std::optional<std::string> version;     ///< "12"; none where releases have no numbers
    std::optional<std::string> kernel;      ///< its first two numbers: "6.1"

    /// What the system says of itself. What it does not say, or not as UTF-8 text of a sensible length, is left out.
    /// Reads two small files at most; any thread.
    [[nodiscard]] CORVANE_EXPORT static OperatingSystemInfo current();
};

}  // namespace corvane
