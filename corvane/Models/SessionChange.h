#pragma once

#include <optional>

namespace corvane {

/// A step of a session's life, as observers are told. The codes may not change.
enum class SessionChange : int {
    willStart = 0,  ///< before a session is created: none is active
    didStart = 1,   ///< the session is active and every processor knows of it
    willEnd = 2,    ///< before the session ends: it is still active
    didEnd = 3,     ///< no session is active and every processor knows; once-only session data is still there
};

/// The change of an integer code, or nothing.
[[nodiscard]] constexpr std::optional<SessionChange> sessionChangeFromCode(int code) {
    if (code < 0 || code > 3) return std::nullopt;
    return static_cast<SessionChange>(code);
}

}  // namespace corvane
