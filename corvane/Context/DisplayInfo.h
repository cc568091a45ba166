#pragma once

#include <corvane/Export.h>

#include <optional>
#include <string>

namespace corvane {

/// Data: the display server that windows would be shown by.
struct DisplayInfo {
    std::string server;  ///< "wayland" or "x11"

    /// What the environment says; nothing where there is no display server. Any thread; no other one may change the
    /// environment meanwhile.
    [[nodiscard]] CORVANE_EXPORT static std::optional<DisplayInfo> current();
};

}  // namespace corvane
