#include <corvane/Session/ActiveSession.h>

#include <utility>

namespace corvane {

ActiveSession::ActiveSession(std::string identifier, Session::Kind kind, Date startDate)
    : identifier_(std::move(identifier)), kind_(std::move(kind)), startDate_(startDate) {}
ActiveSession::~ActiveSession() = default;

void ActiveSession::append(const ProcessEvent& event) {
    ++eventCount_;
    if (events_.size() == keptEvents) events_.pop_front();
    events_.push_back({event.name(), event.json().text(), event.groupName()});
}

std::vector<ProcessEvent> ActiveSession::events() const {
    std::vector<ProcessEvent> events;
    events.reserve(events_.size());
    for (const auto& [name, json, groupName] : events_) {
        events.emplace_back(name, JSON::fromEncodedText(json), groupName);
    }
    return events;
}

}  // namespace corvane
