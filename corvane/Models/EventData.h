#pragma once

#include <corvane/Models/Fields.h>
#include <corvane/Platform/Date.h>

#include <cstdint>
#include <string>
#include <tuple>

namespace corvane {

/// The span of a timed event. The tracker fills it in for an event type that requires it while a timer runs.
struct TimedData {
    Date startTimestamp{};
    Date endTimestamp{};
    std::int64_t duration = 0;  ///< milliseconds, truncated toward zero; negative when the end lies before the start

    TimedData() = default;
    TimedData(Date start, Date end)
        : startTimestamp(start), endTimestamp(end), duration(millisecondsBetween(start, end)) {}

    static constexpr auto corvaneFields() {
        return std::tuple{Field{"startTimestamp", &TimedData::startTimestamp},
                          Field{"endTimestamp", &TimedData::endTimestamp}, Field{"duration", &TimedData::duration}};
    }
};

/// What identifies an event. The tracker fills it in for an event type that requires it.
struct EventData {
    std::string eventID;    ///< a random UUID, upper case
    Date eventTimestamp{};  ///< when the host submitted the event; in JSON, milliseconds since 1970
    std::string eventPath;  ///< the tracker's place: "/root/player"
    std::string sessionID;  ///< the identifier of the session the event belongs to
};

}  // namespace corvane
