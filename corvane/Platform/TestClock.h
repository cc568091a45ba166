#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/BootClock.h>
#include <corvane/Platform/Date.h>

#include <chrono>
#include <optional>

// The clocks in the hands of a test. They are the library's, wherever that lies, and not of the object that includes
// this. Any thread. Internal.
namespace corvane::detail {

/// Stops the wall clock of this process at a date; nothing lets it go again.
CORVANE_EXPORT void setWallClock(std::optional<Date> date) noexcept;
/// See `BootClock::advance`.
CORVANE_EXPORT void advanceBootClock(std::chrono::nanoseconds time) noexcept;

}  // namespace corvane::detail
