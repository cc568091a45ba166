#pragma once

#include <corvane/Bridge/Session/BridgingEventProcessor.h>
#include <corvane/Export.h>
#include <corvane/Processing/UploadBatchEventProcessor.h>

#include <chrono>
#include <functional>
#include <memory>

namespace corvane {

/// The batching processor for object-facing hosts, which add it like one of their own. Callers see it as
/// `CVUploadBatchEventProcessor`. Shared by the host.
class CORVANE_EXPORT BridgedUploadBatchEventProcessor final : public BridgingEventProcessor {
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
    [[nodiscard]] Ledger ledger() const;
    void readLedger(std::function<void(const Ledger& ledger)> completion);
    void setDeliveryObserver(DeliveryObserver observer);

    /// The library's own processor.
    [[nodiscard]] const std::shared_ptr<UploadBatchEventProcessor>& proxyEventProcessor() const {
        return proxyEventProcessor_;
    }

  private:
    explicit BridgedUploadBatchEventProcessor(std::shared_ptr<UploadBatchEventProcessor> eventProcessor);

    const std::shared_ptr<UploadBatchEventProcessor> proxyEventProcessor_;
};

}  // namespace corvane
