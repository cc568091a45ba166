#pragma once

#include <string_view>

namespace corvane {

/// Stops the process with `message` on standard error. The one way in which the library ends on a
/// programming error.
[[noreturn]] void fail(std::string_view message) noexcept;

}  // namespace corvane

/// Checks a precondition, in release builds too. `message` is only evaluated when the condition
/// does not hold.
#define CORVANE_REQUIRE(condition, message) \
    do {                                    \
        if (!(condition)) [[unlikely]]      \
            ::corvane::fail(message);       \
    } while (false)
