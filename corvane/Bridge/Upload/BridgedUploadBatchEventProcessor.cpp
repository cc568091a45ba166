#include <corvane/Bridge/Upload/BridgedUploadBatchEventProcessor.h>

#include <utility>

namespace corvane {

BridgedUploadBatchEventProcessor::BridgedUploadBatchEventProcessor(Client client, const EndpointType& endpoint,
                                                                   const UploadBatchEventConfig& config)
    : BridgedUploadBatchEventProcessor(
          std::make_shared<UploadBatchEventProcessor>(std::move(client), endpoint, config)) {}
BridgedUploadBatchEventProcessor::BridgedUploadBatchEventProcessor(
    std::shared_ptr<UploadBatchEventProcessor> eventProcessor)
    : BridgingEventProcessor(eventProcessor), proxyEventProcessor_(std::move(eventProcessor)) {}
BridgedUploadBatchEventProcessor::~BridgedUploadBatchEventProcessor() = default;

DeliveryReport BridgedUploadBatchEventProcessor::waitForDelivery(std::chrono::steady_clock::time_point deadline,
                                                                 const DeliveryWaitOptions& options) const {
    return proxyEventProcessor_->waitForDelivery(deadline, options);
}
void BridgedUploadBatchEventProcessor::flush() {
    proxyEventProcessor_->flush();
}
Ledger BridgedUploadBatchEventProcessor::ledger() const {
    return proxyEventProcessor_->ledger();
}
void BridgedUploadBatchEventProcessor::readLedger(std::function<void(const Ledger& ledger)> completion) {
    proxyEventProcessor_->readLedger(std::move(completion));
}
void BridgedUploadBatchEventProcessor::setDeliveryObserver(DeliveryObserver observer) {
    proxyEventProcessor_->setDeliveryObserver(std::move(observer));
}

}  // namespace corvane
