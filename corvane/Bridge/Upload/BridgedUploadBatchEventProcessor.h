#pragma once

#include <corvane/Bridge/Session/BridgedEventProcessorType.h>
#include <corvane/Export.h>
#include <corvane/Processing/UploadBatchEventProcessor.h>

#include <chrono>
#include <memory>
#include <string>

namespace corvane {

/// The batching processor for object-facing hosts, which add it like one of their own. Callers see it as
/// `CVUploadBatchEventProcessor`. Shared by the host.
class CORVANE_EXPORT BridgedUploadBatchEventProcessor final : public BridgedEventProcessorType {
  public:
    /// See `UploadBatchEventProcessor`. Throws `InvalidArgument` for an endpoint that cannot be used, and what the
    /// members of the host's own `endpoint` throw.
    BridgedUploadBatchEventProcessor(Client client, const EndpointType& endpoint,
                                     const UploadBatchEventConfig& config = UploadBatchEventConfig::default_());
    BridgedUploadBatchEventProcessor(const BridgedUploadBatchEventProcessor&) = default;
    ~BridgedUploadBatchEventProcessor() override;

    /// See the members of these names of `UploadBatchEventProcessor`.
    DeliveryReport waitForDelivery(std::chrono::steady_clock::time_point deadline,
                                   const DeliveryWaitOptions& options = {}) const;
    void flush();
    void setDeliveryObserver(DeliveryObserver observer);

    /// The library's own processor.
    [[nodiscard]] const std::shared_ptr<UploadBatchEventProcessor>& proxyEventProcessor() const {
        return proxyEventProcessor_;
    }

    void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) override;
    void processEvent(const BridgedProcessEvent& event) override;
    void didEnterGroup(const Group& group) override;
    void didLeaveGroup(const Group& group) override;
    void didStartSession(const BridgedSession& session) override;
    void didUpdateSession(const BridgedSession& session, bool submitEventQueues) override;
    void didEndSession(const BridgedSession& session, Date endDate) override;
    bool resumeBackgroundProcessingForIdentifier(const std::string& identifier,
                                                 const std::function<void()>& completion) override;

  private:
    const std::shared_ptr<UploadBatchEventProcessor> proxyEventProcessor_;
};

}  // namespace corvane
