#pragma once

#include <corvane/Export.h>
#include <corvane/Models/JSON.h>
#include <corvane/Platform/Date.h>

#include <optional>
#include <string>
#include <utility>

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

/// A stretch of activity, such as a flow through several screens. A value.
struct Group {
    std::string name;
    Date startDate;  ///< when the host called enterGroup
};

/// The record of a session as processors receive it. A value: it does not change after it was made.
struct Session {
    /// What a session is for.
    class Kind {
      public:
        enum class Case { custom, userEvents, telemetry, realtime };

        /// A kind of the host's own, named by its text.
        [[nodiscard]] static Kind custom(std::string name) { return Kind(Case::custom, std::move(name)); }
        [[nodiscard]] static Kind userEvents() { return Kind(Case::userEvents, {}); }
        [[nodiscard]] static Kind telemetry() { return Kind(Case::telemetry, {}); }
        [[nodiscard]] static Kind realtime() { return Kind(Case::realtime, {}); }

        [[nodiscard]] Case which() const { return case_; }
        /// The name of a custom kind; empty for the others.
        [[nodiscard]] const std::string& name() const { return name_; }

        friend bool operator==(const Kind&, const Kind&) = default;

      private:
        Kind(Case which, std::string name) : case_(which), name_(std::move(name)) {}

        Case case_;
        std::string name_;
    };

    std::string identifier;  ///< a random UUID, upper case
    Kind kind;
    Date startDate;    ///< when the host called start
    JSON sessionData;  ///< an object: "sessionID" and one entry for each session data on top of its stack
};

}  // namespace corvane
