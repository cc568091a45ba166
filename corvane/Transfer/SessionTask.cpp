#include <corvane/Transfer/SessionTask.h>

#include <algorithm>
#include <utility>

namespace corvane {

SessionTask::SessionTask(std::int64_t identifier, std::optional<std::string> description)
    : identifier_(identifier), description_(std::move(description)) {}

void SessionTask::setDescription(std::string description) {
    description_.set(std::move(description));
}

// A body that is sent again after the agent was lost starts anew; nothing is reported until it is beyond what was.
bool SessionTask::note(std::int64_t total, std::int64_t expected) {
    Lock lock(mutex_);
    if (total <= reported_) return false;
    noted_.total = std::max(noted_.total, total);
    noted_.expected = expected;
    return !std::exchange(reportPending_, true);
}

SessionTask::Progress SessionTask::takeProgress() {
    Lock lock(mutex_);
    reportPending_ = false;
    noted_.step = noted_.total - std::exchange(reported_, noted_.total);
    return noted_;
}

}  // namespace corvane
