#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Date.h>

#include <optional>
#include <string>

namespace corvane {

/// Data: how this process came about.
struct ProcessInfo {
    std::optional<Date> start;          ///< when it was started, to a hundredth of a second
    std::optional<std::string> parent;  ///< the name of the program that has started it: "systemd", "bash"
    bool isInContainer = false;         ///< whether there are signs of a container around it

    /// What the system says. What it does not say is left out; `parent` is that of the time of the call, which is
    /// another one once the first has ended. Any thread; no other one may change the environment meanwhile.
    [[nodiscard]] CORVANE_EXPORT static ProcessInfo current();
};

}  // namespace corvane
