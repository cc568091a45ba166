#pragma once

#include <corvane/Bridge/Session/BridgedSessionKind.h>
#include <corvane/Export.h>
#include <corvane/Models/Session.h>

#include <optional>
#include <string>
#include <utility>

namespace corvane {

/// The record of a session as processors see it. Callers see it as `CVSession`. A value: it does not change after it
/// was made.
class CORVANE_EXPORT BridgedSession {
  public:
    explicit BridgedSession(Session session) : session_(std::move(session)) {}

    [[nodiscard]] const std::string& identifier() const { return session_.identifier; }
    [[nodiscard]] BridgedSessionKind kind() const;
    /// The name of a custom kind; nothing for the others.
    [[nodiscard]] std::optional<std::string> name() const;
    [[nodiscard]] Date startDate() const { return session_.startDate; }
    /// An object: "sessionID" and one entry for each session data in effect.
    [[nodiscard]] const JSON& sessionData() const { return session_.sessionData; }

    /// The library's own record.
    [[nodiscard]] const Session& session() const { return session_; }

  private:
    Session session_;
};

}  // namespace corvane
