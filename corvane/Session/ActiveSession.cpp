#include <corvane/Session/ActiveSession.h>

#include <utility>

namespace corvane {

ActiveSession::ActiveSession(std::string identifier, Session::Kind kind, Date startDate)
    : identifier_(std::move(identifier)), kind_(std::move(kind)), startDate_(startDate) {}
ActiveSession::~ActiveSession() = default;

void ActiveSession::append(const ProcessEvent& event) {
    ++eventCount_;
    if (events_.size() == keptEvents) events_.pop_front();
    events_.emplace_back(event.name(), event.json().compacted(), event.groupName());
}

}  // namespace corvane
