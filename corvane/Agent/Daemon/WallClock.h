#pragma once

#include <chrono>
#include <cstdint>

namespace corvane::transferd {

/// The time of day in milliseconds since 1970, which outlives the process in the journal.
[[nodiscard]] inline std::int64_t wallClock() {
    const auto now = std::chrono::system_clock::now().time_since_epoch();
    return std::chrono::duration_cast<std::chrono::milliseconds>(now).count();
}

}  // namespace corvane::transferd
