#pragma once

#include <corvane/Platform/BootClock.h>

#include <chrono>
#include <optional>

namespace corvane {

/// When what did not get through is next sent again: after a delay that doubles with each pass in vain, is the first
/// one again when something gets through, and is never before the time that the server has asked for. A fleet that was
/// refused at one moment comes back spread over a quarter of the wait. Not thread-safe. Internal.
class RetrySchedule {
  public:
    using Time = BootClock::time_point;

    /// Delays do not grow beyond this: that long a server may be back before it is noticed.
    static constexpr auto longestDelay = std::chrono::hours(1);

    /// @param firstDelay at least 1 ms; one that is longer than `longestDelay` does not grow
    /// @param chance where in the quarter the first pass comes: from 0 to 1
    RetrySchedule(std::chrono::milliseconds firstDelay, double chance);

    /// Plans the next pass, unless there is a plan.
    void plan(Time now);
    /// Something got through: the server may well take the rest, too.
    void succeed(Time now);
    /// The pass that was planned begins.
    /// @param chance of the one after it
    void begin(double chance);
    /// There is nothing left to send.
    void drop() { planned_.reset(); }
    /// The pass has brought nothing through.
    void fail();
    /// The server wants to be left alone for so long.
    void hold(Time now, std::chrono::seconds time);

    /// When the next pass is due; nothing when none is planned.
    [[nodiscard]] std::optional<Time> due() const;
    [[nodiscard]] bool isHeld(Time now) const { return heldUntil_ > now; }

  private:
    [[nodiscard]] std::chrono::nanoseconds spread(std::chrono::nanoseconds wait) const;

    const std::chrono::nanoseconds firstDelay_;
    std::chrono::nanoseconds delay_;
    double chance_;
    std::optional<Time> planned_;
    Time heldUntil_ = Time::min();
};

}  // namespace corvane
