#pragma once

#include <corvane/Bridge/Session/BridgingEventProcessor.h>
#include <corvane/Export.h>
#include <corvane/Processing/SamplingEventProcessor.h>

#include <memory>

namespace corvane {

/// Keeps one session in N for an object-facing host's processor: see `SamplingEventProcessor`. Callers see it as
/// `CVSamplingEventProcessor`. It is added in place of the processor that it wraps, and is the one to remove.
class CORVANE_EXPORT BridgingSamplingEventProcessor final : public BridgingEventProcessor {
  public:
    /// Throws `BridgeError::missingObject` without a processor, and `InvalidArgument` for a `keepOneIn` below 1.
    BridgingSamplingEventProcessor(std::shared_ptr<BridgedEventProcessorType> eventProcessor, int keepOneIn);
    BridgingSamplingEventProcessor(const BridgingSamplingEventProcessor&) = default;
    ~BridgingSamplingEventProcessor() override;

    /// The library's own processor, which has the counts.
    [[nodiscard]] const std::shared_ptr<SamplingEventProcessor>& proxyEventProcessor() const {
        return proxyEventProcessor_;
    }

  private:
    explicit BridgingSamplingEventProcessor(std::shared_ptr<SamplingEventProcessor> eventProcessor);

    const std::shared_ptr<SamplingEventProcessor> proxyEventProcessor_;
};

}  // namespace corvane
