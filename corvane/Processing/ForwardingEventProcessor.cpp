#include <corvane/Processing/ForwardingEventProcessor.h>

#include <corvane/Platform/Error.h>

#include <utility>

namespace corvane {

ForwardingEventProcessor::ForwardingEventProcessor(std::shared_ptr<EventProcessorType> eventProcessor)
    : eventProcessor_(std::move(eventProcessor)) {
    if (!eventProcessor_) throw InvalidArgument("there is no event processor to wrap");
}
ForwardingEventProcessor::~ForwardingEventProcessor() = default;

bool ForwardingEventProcessor::claim(const std::shared_ptr<SerialQueue>& accessQueue) {
    const Lock lock(registrationMutex_);
    if (accessQueue_ == accessQueue) return false;
    if (accessQueue_) throw InvalidArgument("the wrapping processor belongs to another session manager already");
    accessQueue_ = accessQueue;
    return true;
}

void ForwardingEventProcessor::registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) {
    const bool isFirst = claim(accessQueue);
    try {
        eventProcessor_->registerAccessQueue(std::move(accessQueue));
    } catch (...) {
        const Lock lock(registrationMutex_);
        if (isFirst) accessQueue_ = nullptr;
        throw;
    }
}

void ForwardingEventProcessor::process(const ProcessEvent& processEvent) {
    eventProcessor_->process(processEvent);
}
void ForwardingEventProcessor::didEnterGroup(const Group& group) {
    eventProcessor_->didEnterGroup(group);
}
void ForwardingEventProcessor::didLeaveGroup(const Group& group) {
    eventProcessor_->didLeaveGroup(group);
}
void ForwardingEventProcessor::didStartSession(const Session& session) {
    eventProcessor_->didStartSession(session);
}
void ForwardingEventProcessor::didUpdateSession(const Session& session, bool submitQueues) {
    eventProcessor_->didUpdateSession(session, submitQueues);
}
void ForwardingEventProcessor::didEndSession(const Session& session, Date endDate) {
    eventProcessor_->didEndSession(session, endDate);
}
void ForwardingEventProcessor::didReject(const RejectedEvent& event) {
    eventProcessor_->didReject(event);
}
ForgottenRecords ForwardingEventProcessor::forget() {
    return eventProcessor_->forget();
}
const void* ForwardingEventProcessor::identity() const {
    return eventProcessor_->identity();
}
bool ForwardingEventProcessor::resumeBackgroundProcessing(const std::string& identifier,
                                                          const std::function<void()>& completion) {
    return eventProcessor_->resumeBackgroundProcessing(identifier, completion);
}

}  // namespace corvane
