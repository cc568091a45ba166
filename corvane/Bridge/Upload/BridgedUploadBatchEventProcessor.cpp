#include <corvane/Bridge/Upload/BridgedUploadBatchEventProcessor.h>

#include <utility>

namespace corvane {

BridgedUploadBatchEventProcessor::BridgedUploadBatchEventProcessor(Client client, const EndpointType& endpoint,
                                                                   const UploadBatchEventConfig& config)
    : proxyEventProcessor_(std::make_shared<UploadBatchEventProcessor>(std::move(client), endpoint, config)) {}
BridgedUploadBatchEventProcessor::~BridgedUploadBatchEventProcessor() = default;

DeliveryReport BridgedUploadBatchEventProcessor::waitForDelivery(std::chrono::steady_clock::time_point deadline,
                                                                 const DeliveryWaitOptions& options) const {
    return proxyEventProcessor_->waitForDelivery(deadline, options);
}
void BridgedUploadBatchEventProcessor::flush() {
    proxyEventProcessor_->flush();
}
void BridgedUploadBatchEventProcessor::setDeliveryObserver(DeliveryObserver observer) {
    proxyEventProcessor_->setDeliveryObserver(std::move(observer));
}
void BridgedUploadBatchEventProcessor::registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) {
    proxyEventProcessor_->registerAccessQueue(std::move(accessQueue));
}
void BridgedUploadBatchEventProcessor::processEvent(const BridgedProcessEvent& event) {
    proxyEventProcessor_->process(event.processEvent());
}
void BridgedUploadBatchEventProcessor::didEnterGroup(const Group& group) {
    proxyEventProcessor_->didEnterGroup(group);
}
void BridgedUploadBatchEventProcessor::didLeaveGroup(const Group& group) {
    proxyEventProcessor_->didLeaveGroup(group);
}
void BridgedUploadBatchEventProcessor::didStartSession(const BridgedSession& session) {
    proxyEventProcessor_->didStartSession(session.session());
}
void BridgedUploadBatchEventProcessor::didUpdateSession(const BridgedSession& session, bool submitEventQueues) {
    proxyEventProcessor_->didUpdateSession(session.session(), submitEventQueues);
}
void BridgedUploadBatchEventProcessor::didEndSession(const BridgedSession& session, Date endDate) {
    proxyEventProcessor_->didEndSession(session.session(), endDate);
}
bool BridgedUploadBatchEventProcessor::resumeBackgroundProcessingForIdentifier(
    const std::string& identifier, const std::function<void()>& completion) {
    return proxyEventProcessor_->resumeBackgroundProcessing(identifier, completion);
}

}  // namespace corvane
