#include <corvane/Bridge/Session/BridgedEventProcessor.h>

#include <corvane/Bridge/Models/Refusal.h>

#include <utility>

namespace corvane {

BridgedEventProcessor::BridgedEventProcessor(std::shared_ptr<BridgedEventProcessorType> eventProcessor)
    : eventProcessor_(bridge::present(std::move(eventProcessor), "the event processor")) {}
BridgedEventProcessor::~BridgedEventProcessor() = default;

void BridgedEventProcessor::registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) {
    eventProcessor_->registerAccessQueue(std::move(accessQueue));
}
void BridgedEventProcessor::process(const ProcessEvent& processEvent) {
    eventProcessor_->processEvent(BridgedProcessEvent(processEvent));
}
void BridgedEventProcessor::didEnterGroup(const Group& group) {
    eventProcessor_->didEnterGroup(group);
}
void BridgedEventProcessor::didLeaveGroup(const Group& group) {
    eventProcessor_->didLeaveGroup(group);
}
void BridgedEventProcessor::didStartSession(const Session& session) {
    eventProcessor_->didStartSession(BridgedSession(session));
}
void BridgedEventProcessor::didUpdateSession(const Session& session, bool submitQueues) {
    eventProcessor_->didUpdateSession(BridgedSession(session), submitQueues);
}
void BridgedEventProcessor::didEndSession(const Session& session, Date endDate) {
    eventProcessor_->didEndSession(BridgedSession(session), endDate);
}
void BridgedEventProcessor::didReject(const RejectedEvent& event) {
    eventProcessor_->didReject(event);
}
ForgottenRecords BridgedEventProcessor::forget() {
    return eventProcessor_->forget();
}
bool BridgedEventProcessor::resumeBackgroundProcessing(const std::string& identifier,
                                                       const std::function<void()>& completion) {
    return eventProcessor_->resumeBackgroundProcessingForIdentifier(identifier, completion);
}

}  // namespace corvane
