#include <corvane/c/Event.h>

#include <corvane/Bridge/Models/BridgedEventData.h>
#include <corvane/c/Call.h>
#include <corvane/c/corvane.h>

#include <algorithm>
#include <utility>

namespace corvane::c {

namespace {

BridgedDataEventClass classOf(std::string data) {
    if (data == CORVANE_EVENT_DATA) return BridgedEventData::dataClass();
    if (data == CORVANE_TIMED_DATA) return BridgedTimedData::dataClass();
    return BridgedDataEventClass(std::move(data));
}

}  // namespace

void Event::add(std::string property, std::string data, BridgedEventPropertyRequirement requirement) {
    Lock lock(mutex_);
    if (event_) refuse(CORVANE_IN_USE, "an event that was used gets no further properties: " + name_);
    const auto isSame = [&](const auto& other) { return other.first == property; };
    if (std::any_of(properties_.begin(), properties_.end(), isSame)) {
        throw BridgeError(BridgeError::repeatedProperty, "property " + property);
    }
    properties_.emplace_back(std::move(property), BridgedRawEventProperty(classOf(std::move(data)), requirement));
}

BridgedRawEvent Event::use() {
    Lock lock(mutex_);
    if (!event_) event_.emplace(name_, std::move(properties_));
    return *event_;
}

}  // namespace corvane::c
