#pragma once

namespace corvane {

/// What a session is for. Callers see it as `CVSessionKind`, and may hand over any integer: a call with one that is not
/// a value here is refused. The values may not change.
enum class BridgedSessionKind : int {
    userEvents = 0,
    telemetry = 1,
    realtime = 2,
    custom = 3,  ///< a kind of the host's own, which has a name
};

}  // namespace corvane
