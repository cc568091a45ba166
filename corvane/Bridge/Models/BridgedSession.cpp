#include <corvane/Bridge/Models/BridgedSession.h>

namespace corvane {

BridgedSessionKind BridgedSession::kind() const {
    switch (session_.kind.which()) {
        case Session::Kind::Case::userEvents:
            return BridgedSessionKind::userEvents;
        case Session::Kind::Case::telemetry:
            return BridgedSessionKind::telemetry;
        case Session::Kind::Case::realtime:
            return BridgedSessionKind::realtime;
        case Session::Kind::Case::custom:
            break;
    }
    return BridgedSessionKind::custom;
}

std::optional<std::string> BridgedSession::name() const {
    if (kind() != BridgedSessionKind::custom) return std::nullopt;
    return session_.kind.name();
}

}  // namespace corvane
