#pragma once

#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Export.h>
#include <corvane/Models/Session.h>

#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace corvane {

/// What a session is for. Callers see it as `CVSessionKind`, and may hand over any integer: a call with one that is not
/// a value here is refused. The values may not change.
enum class BridgedSessionKind : int {
    userEvents = 0,
    telemetry = 1,
    realtime = 2,
    custom = 3,  ///< a kind of the host's own, which has a name
};

/// A data event with the key by which a session carries it. Callers see it as `CVSessionData`. A value.
class BridgedSessionData {
  public:
    BridgedSessionData(std::string key, std::shared_ptr<const BridgedDataEventType> data)
        : key_(std::move(key)), data_(std::move(data)) {}

    [[nodiscard]] const std::string& key() const { return key_; }
    [[nodiscard]] const std::shared_ptr<const BridgedDataEventType>& data() const { return data_; }

  private:
    std::string key_;
    std::shared_ptr<const BridgedDataEventType> data_;
};

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
