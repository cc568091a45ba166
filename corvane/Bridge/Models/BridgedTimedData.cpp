#include <corvane/Bridge/Models/BridgedTimedData.h>

#include <utility>

namespace corvane {

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
