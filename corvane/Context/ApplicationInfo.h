#pragma once

#include <corvane/Export.h>

#include <optional>
#include <string>

namespace corvane {

/// Data: the application, as the bundle file beside its executable has it (see `Bundle`).
struct ApplicationInfo {
    std::optional<std::string> identifier;  ///< "com.example.player"
    std::optional<std::string> name;        ///< "Player"; without a bundle file the executable's name
    std::optional<std::string> version;     ///< "2.3"
    std::optional<std::string> build;       ///< "117"

    /// Reads the bundle file. What it does not say is left out. Any thread.
    [[nodiscard]] CORVANE_EXPORT static ApplicationInfo current();
};

}  // namespace corvane
