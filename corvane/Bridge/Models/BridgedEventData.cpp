#include <corvane/Bridge/Models/BridgedEventData.h>

#include <utility>

namespace corvane {

BridgedEventData::BridgedEventData(EventData eventData) : eventData_(std::move(eventData)) {}
BridgedEventData::~BridgedEventData() = default;

BridgedDataEventClass BridgedEventData::dataClass() {
    const DataType type = DataType::of<EventData>();
    return {std::string(type.name()), type};
}

std::string BridgedEventData::dataName() const {
    return std::string(typeName<EventData>());
}

HostValue::Dictionary BridgedEventData::toDict() const {
    return {{"eventID", eventID()},
            {"eventTimestamp", eventDate()},
            {"eventPath", eventPath()},
            {"sessionID", sessionID()}};
}

BridgedTimedData::BridgedTimedData(TimedData timedData) : timedData_(timedData) {}
BridgedTimedData::~BridgedTimedData() = default;

BridgedDataEventClass BridgedTimedData::dataClass() {
    const DataType type = DataType::of<TimedData>();
    return {std::string(type.name()), type};
}

std::string BridgedTimedData::dataName() const {
    return std::string(typeName<TimedData>());
}

HostValue::Dictionary BridgedTimedData::toDict() const {
    return {{"startTimestamp", startDate()}, {"endTimestamp", endDate()}, {"duration", duration()}};
}

}  // namespace corvane
