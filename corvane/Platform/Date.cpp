#include <corvane/Platform/Date.h>

#include <corvane/Platform/TestClock.h>

#include <atomic>
#include <cmath>
#include <cstdio>
#include <ctime>
#include <limits>

namespace corvane {

namespace {
using Ticks = Date::duration;
constexpr std::int64_t ticksPerMillisecond = std::chrono::duration_cast<Ticks>(std::chrono::milliseconds(1)).count();
constexpr double ticksPerSecond =
    static_cast<double>(std::chrono::duration_cast<Ticks>(std::chrono::seconds(1)).count());

constexpr Ticks::rep notStopped = std::numeric_limits<Ticks::rep>::min();
constinit std::atomic<Ticks::rep> stoppedAt = notStopped;
}  // namespace

Date now() noexcept {
    const Ticks::rep ticks = stoppedAt.load(std::memory_order_relaxed);
    return ticks == notStopped ? std::chrono::system_clock::now() : Date(Ticks(ticks));
}

void detail::setWallClock(std::optional<Date> date) noexcept {
    stoppedAt = date ? date->time_since_epoch().count() : notStopped;
}

void detail::advanceBootClock(std::chrono::nanoseconds time) noexcept {
    BootClock::advance(time);
}

std::int64_t millisecondsBetween(Date start, Date end) {
    const std::int64_t from = start.time_since_epoch().count();
    const std::int64_t to = end.time_since_epoch().count();
    std::int64_t difference = 0;
    if (!__builtin_sub_overflow(to, from, &difference)) return difference / ticksPerMillisecond;
    // Further apart than a duration can say: the milliseconds still fit.
    return to / ticksPerMillisecond - from / ticksPerMillisecond;
}

std::optional<Date> dateFromMilliseconds(std::int64_t milliseconds) {
    constexpr auto limit = std::numeric_limits<std::int64_t>::max() / ticksPerMillisecond;
    if (milliseconds > limit || milliseconds < -limit) return std::nullopt;
    return Date(std::chrono::duration_cast<Ticks>(std::chrono::milliseconds(milliseconds)));
}

double secondsSince1970(Date date) {
    return static_cast<double>(date.time_since_epoch().count()) / ticksPerSecond;
}

std::optional<Date> dateFromSeconds(double seconds) {
    const double ticks = std::round(seconds * ticksPerSecond);
    constexpr double limit = 0x1p63;
    if (!(ticks > -limit && ticks < limit)) return std::nullopt;
    return Date(Ticks(static_cast<std::int64_t>(ticks)));
}

std::string description(Date date) {
    const std::time_t seconds = std::chrono::floor<std::chrono::seconds>(date).time_since_epoch().count();
    std::tm parts{};
    gmtime_r(&seconds, &parts);
    char text[64];
    const std::size_t length = std::strftime(text, sizeof text, "%Y-%m-%d %H:%M:%S +0000", &parts);
    return {text, length};
}

}  // namespace corvane
