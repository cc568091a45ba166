#pragma once

#include <corvane/Export.h>

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>

namespace corvane {

/// A point in time. In JSON a date is a count of milliseconds, in a database row a number of
/// seconds; both count from 1970-01-01T00:00:00Z.
using Date = std::chrono::system_clock::time_point;

/// The wall clock, or what a test has put in its place.
[[nodiscard]] CORVANE_EXPORT Date now() noexcept;

/// Whole milliseconds since 1970, truncated toward zero.
[[nodiscard]] constexpr std::int64_t millisecondsSince1970(Date date) {
    return std::chrono::duration_cast<std::chrono::milliseconds>(date.time_since_epoch()).count();
}

/// Whole milliseconds from `start` to `end`, truncated toward zero; negative when `end` lies before
/// `start`.
[[nodiscard]] CORVANE_EXPORT std::int64_t millisecondsBetween(Date start, Date end);

/// The date of a count of milliseconds, or nothing when no `Date` can hold it (about 292 years
/// either side of 1970).
[[nodiscard]] CORVANE_EXPORT std::optional<Date> dateFromMilliseconds(std::int64_t milliseconds);

[[nodiscard]] CORVANE_EXPORT double secondsSince1970(Date date);

/// The date of a number of seconds, or nothing when it is not finite or no `Date` can hold it.
[[nodiscard]] CORVANE_EXPORT std::optional<Date> dateFromSeconds(double seconds);

/// A date as a person reads it, in whole seconds: "2026-11-22 20:31:55 +0000".
[[nodiscard]] CORVANE_EXPORT std::string description(Date date);

}  // namespace corvane
