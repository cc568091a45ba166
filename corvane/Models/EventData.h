#pragma once

#include <corvane/Platform/Date.h>

#include <string>

namespace corvane {

/// What identifies an event. The tracker fills it in for an event type that requires it.
struct EventData {
    std::string eventID;    ///< a random UUID, upper case
    Date eventTimestamp{};  ///< when the host submitted the event; in JSON, milliseconds since 1970
    std::string eventPath;  ///< the tracker's place: "/root/player"
    std::string sessionID;  ///< the identifier of the session the event belongs to
};

}  // namespace corvane
