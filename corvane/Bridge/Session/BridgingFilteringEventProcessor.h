#pragma once

#include <corvane/Bridge/Session/BridgingEventProcessor.h>
#include <corvane/Export.h>
#include <corvane/Processing/FilteringEventProcessor.h>

#include <functional>
#include <memory>
#include <optional>

namespace corvane {

/// Drops or rewrites events before an object-facing host's processor gets them: see `FilteringEventProcessor`. Callers
/// see it as `CVFilteringEventProcessor`. It is added in place of the processor that it wraps, and is the one to
/// remove.
class CORVANE_EXPORT BridgingFilteringEventProcessor final : public BridgingEventProcessor {
  public:
    /// Returns the event as it is to go on: itself, another one in its place, or nothing. Called on the session
    /// manager's queue; when it throws, the event is dropped.
    using Filter = std::function<std::optional<BridgedProcessEvent>(const BridgedProcessEvent&)>;

    /// Throws `BridgeError::missingObject` without a processor or a filter.
    BridgingFilteringEventProcessor(std::shared_ptr<BridgedEventProcessorType> eventProcessor, Filter filter);
    BridgingFilteringEventProcessor(const BridgingFilteringEventProcessor&) = default;
    ~BridgingFilteringEventProcessor() override;

    /// The library's own processor, which has the counts.
    [[nodiscard]] const std::shared_ptr<FilteringEventProcessor>& proxyEventProcessor() const {
        return proxyEventProcessor_;
    }

  private:
    explicit BridgingFilteringEventProcessor(std::shared_ptr<FilteringEventProcessor> eventProcessor);

    const std::shared_ptr<FilteringEventProcessor> proxyEventProcessor_;
};

}  // namespace corvane
