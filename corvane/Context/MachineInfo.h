#pragma once

#include <corvane/Export.h>

#include <cstdint>
#include <optional>
#include <string>

namespace corvane {

/// Data: what kind of machine the process runs on. Nothing in it tells one machine of a kind from the next.
struct MachineInfo {
    std::optional<std::string> architecture;  ///< "x86_64", "aarch64"
    std::optional<std::int64_t> cores;        ///< those that this process may use, at most 256
    std::optional<std::int64_t>
        memoryClass;  ///< GiB, rounded up to 1, 2, 4, 8, 16, 32, 64 or 128, the last for more too

    /// What the system says. What it does not say is left out. Any thread.
    [[nodiscard]] CORVANE_EXPORT static MachineInfo current();
};

}  // namespace corvane
