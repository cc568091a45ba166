#pragma once

#include <corvane/Bridge/Models/BridgedError.h>
#include <corvane/Bridge/Session/BridgedEventProcessorType.h>
#include <corvane/Export.h>
#include <corvane/Processing/ProcessorManager.h>

#include <functional>
#include <memory>
#include <string>

namespace corvane {

/// Where a host adds and removes its processors. Callers see it as `CVProcessorManager`. Shared by the host; all
/// members may be called from any thread and return at once.
class CORVANE_EXPORT BridgedProcessorManager {
  public:
    /// Throws `BridgeError::missingObject` without a manager.
    explicit BridgedProcessorManager(std::shared_ptr<ProcessorManager> processorManager);
    ~BridgedProcessorManager();

    /// Adds a processor at the end. Refuses, with false and `error` filled, a missing one and one whose
    /// `registerAccessQueue` throws.
    bool addEventProcessor(const std::shared_ptr<BridgedEventProcessorType>& eventProcessor,
                           BridgedError* error = nullptr);
    /// Removes every entry of a processor, which gets no further callback; nothing if it was never added.
    void removeEventProcessor(const std::shared_ptr<BridgedEventProcessorType>& eventProcessor);
    /// Hands on that the platform woke the application for a background transfer session.
    void resumeBackgroundProcessingForIdentifier(std::string identifier, std::function<void()> completion);

    /// The library's own manager.
    [[nodiscard]] const std::shared_ptr<ProcessorManager>& processorManager() const { return processorManager_; }

  private:
    const std::shared_ptr<ProcessorManager> processorManager_;
};

}  // namespace corvane
