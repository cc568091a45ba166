#include <corvane/Tracker/AccessTracker.h>

#include <corvane/Tracker/Tracker.h>

namespace corvane {

void AccessTracker::submit(const EventSubmit& event, Date submitTime, const SubmitOptions& options) const {
    if (const auto tracker = tracker_.lock()) tracker->submitNow(event, submitTime, options);
}

void AccessTracker::time(const EventSubmit& event, Date startTime, bool submitAndRestartWithSession) const {
    if (const auto tracker = tracker_.lock()) tracker->performTime(event, startTime, submitAndRestartWithSession);
}

void AccessTracker::push(AnyDataEventEntry entry) const {
    if (const auto tracker = tracker_.lock()) tracker->performPush(std::move(entry));
}

void AccessTracker::pop(std::string_view key, DataType type) const {
    if (const auto tracker = tracker_.lock()) tracker->performPop(key, type);
}

bool AccessTracker::isUsable() const {
    const auto tracker = tracker_.lock();
    return !tracker || tracker->accessQueue_->isCurrent();
}

}  // namespace corvane
