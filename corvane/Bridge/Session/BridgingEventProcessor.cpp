#include <corvane/Bridge/Session/BridgingEventProcessor.h>

#include <utility>

namespace corvane {

BridgingEventProcessor::BridgingEventProcessor(std::shared_ptr<EventProcessorType> eventProcessor)
    : eventProcessor_(std::move(eventProcessor)) {}
BridgingEventProcessor::~BridgingEventProcessor() = default;

void BridgingEventProcessor::registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) {
    eventProcessor_->registerAccessQueue(std::move(accessQueue));
}
void BridgingEventProcessor::processEvent(const BridgedProcessEvent& event) {
    eventProcessor_->process(event.processEvent());
}
void BridgingEventProcessor::didEnterGroup(const Group& group) {
    eventProcessor_->didEnterGroup(group);
}
void BridgingEventProcessor::didLeaveGroup(const Group& group) {
    eventProcessor_->didLeaveGroup(group);
}
void BridgingEventProcessor::didStartSession(const BridgedSession& session) {
    eventProcessor_->didStartSession(session.session());
}
void BridgingEventProcessor::didUpdateSession(const BridgedSession& session, bool submitEventQueues) {
    eventProcessor_->didUpdateSession(session.session(), submitEventQueues);
}
void BridgingEventProcessor::didEndSession(const BridgedSession& session, Date endDate) {
    eventProcessor_->didEndSession(session.session(), endDate);
}
void BridgingEventProcessor::didReject(const RejectedEvent& event) {
    eventProcessor_->didReject(event);
}
ForgottenRecords BridgingEventProcessor::forget() {
    return eventProcessor_->forget();
}
bool BridgingEventProcessor::resumeBackgroundProcessingForIdentifier(const std::string& identifier,
                                                                     const std::function<void()>& completion) {
    return eventProcessor_->resumeBackgroundProcessing(identifier, completion);
}

}  // namespace corvane
