#pragma once

#include <atomic>
#include <chrono>

namespace corvane {

/// The time since the machine was started: it goes on while the machine is suspended, and heeds no change of the wall
/// clock. A clock in the sense of <chrono>, and the one that timers follow. Internal.
struct BootClock {
    using duration = std::chrono::nanoseconds;
    using rep = duration::rep;
    using period = duration::period;
    using time_point = std::chrono::time_point<BootClock>;
    static constexpr bool is_steady = true;

    static time_point now() noexcept;

    /// For tests: moves the clock of this process forward. A queue sees it when it next has something to do.
    static void advance(duration time) noexcept { advanced_ += time.count(); }
    /// How far it was moved.
    static duration advanced() noexcept { return duration(advanced_.load()); }

  private:
    static inline std::atomic<rep> advanced_ = 0;
};

}  // namespace corvane
