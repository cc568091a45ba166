#include <corvane/Processing/UploadBatchEventProcessor.h>

#include <corvane/Platform/Error.h>
#include <corvane/Processing/UploadBatches.h>

#include <utility>

namespace corvane {

UploadBatchEventConfig::UploadBatchEventConfig(int batchSize, bool batchDebugging)
    : UploadBatchEventConfig(UploadBatchEventOptions{.batchSize = batchSize, .batchDebugging = batchDebugging}) {}

UploadBatchEventConfig::UploadBatchEventConfig(const UploadBatchEventOptions& options) : options_(options) {
    if (options.batchSize < 1) throw InvalidArgument("the batch size must be at least 1");
    if (options.maximumBytesOnDisk < 1) throw InvalidArgument("the maximum of bytes on disk must be at least 1");
    if (options.maximumAge && options.maximumAge->count() < 1) {
        throw InvalidArgument("the maximum age must be at least 1 millisecond");
    }
    if (options.maximumDelay && *options.maximumDelay < std::chrono::milliseconds(1))
        throw InvalidArgument("the maximum delay must be at least 1 ms");
    if (options.retryDelay && *options.retryDelay < std::chrono::milliseconds(1))
        throw InvalidArgument("the retry delay must be at least 1 ms");
}

const UploadBatchEventConfig& UploadBatchEventConfig::default_() {
    static const UploadBatchEventConfig config;
    return config;
}

UploadBatchEventProcessor::UploadBatchEventProcessor(Client client, const EndpointType& endpoint,
                                                     const UploadBatchEventConfig& config)
    : UploadBatchEventProcessor(UploadBatches::make(std::move(client), Endpoint::copyOf(endpoint), config)) {}
UploadBatchEventProcessor::UploadBatchEventProcessor(std::shared_ptr<UploadBatches> batches)
    : batches_(std::move(batches)) {}
UploadBatchEventProcessor::~UploadBatchEventProcessor() {
    batches_->setDeliveryObserver({});
}

DeliveryReport UploadBatchEventProcessor::waitForDelivery(std::chrono::steady_clock::time_point deadline,
                                                          const DeliveryWaitOptions& options) const {
    return batches_->waitForDelivery(deadline, options);
}
void UploadBatchEventProcessor::flush() {
    batches_->flush();
}
void UploadBatchEventProcessor::setDeliveryObserver(DeliveryObserver observer) {
    batches_->setDeliveryObserver(std::move(observer));
}
void UploadBatchEventProcessor::registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) {
    batches_->registerAccessQueue(std::move(accessQueue));
}
void UploadBatchEventProcessor::process(const ProcessEvent& processEvent) {
    batches_->process(processEvent);
}
void UploadBatchEventProcessor::didLeaveGroup(const Group& group) {
    batches_->didLeaveGroup(group);
}
void UploadBatchEventProcessor::didStartSession(const Session& session) {
    batches_->didStartSession(session);
}
void UploadBatchEventProcessor::didUpdateSession(const Session& session, bool submitQueues) {
    batches_->didUpdateSession(session, submitQueues);
}
void UploadBatchEventProcessor::didEndSession(const Session&, Date) {
    batches_->didEndSession();
}
void UploadBatchEventProcessor::didReject(const RejectedEvent& event) {
    batches_->didReject(event.reason);
}
ForgottenRecords UploadBatchEventProcessor::forget() {
    return batches_->forget();
}
Ledger UploadBatchEventProcessor::ledger() const {
    return batches_->ledger();
}
void UploadBatchEventProcessor::readLedger(std::function<void(const Ledger&)> completion) {
    batches_->readLedger(std::move(completion));
}
bool UploadBatchEventProcessor::resumeBackgroundProcessing(const std::string& identifier,
                                                           const std::function<void()>& completion) {
    return batches_->resumeBackgroundProcessing(identifier, completion);
}

}  // namespace corvane
