#pragma once

#include <corvane/Bridge/Session/BridgedEventProcessorType.h>
#include <corvane/Processing/EventProcessorType.h>

#include <memory>
#include <string>

namespace corvane {

/// Stands for a host's object-facing processor among the library's: forwards every callback, with its arguments as the
/// host sees them. Two of them that stand for one object are one processor.
class BridgedEventProcessor final : public EventProcessorType {
  public:
    /// Throws `BridgeError::missingObject` without a processor.
    explicit BridgedEventProcessor(std::shared_ptr<BridgedEventProcessorType> eventProcessor);
    BridgedEventProcessor(const BridgedEventProcessor&) = default;
    ~BridgedEventProcessor() override;

    void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) override;
    void process(const ProcessEvent& processEvent) override;
    void didEnterGroup(const Group& group) override;
    void didLeaveGroup(const Group& group) override;
    void didStartSession(const Session& session) override;
    void didUpdateSession(const Session& session, bool submitQueues) override;
    void didEndSession(const Session& session, Date endDate) override;
    void didReject(const RejectedEvent& event) override;
    ForgottenRecords forget() override;
    [[nodiscard]] const void* identity() const override { return eventProcessor_.get(); }
    bool resumeBackgroundProcessing(const std::string& identifier, const std::function<void()>& completion) override;

  private:
    const std::shared_ptr<BridgedEventProcessorType> eventProcessor_;
};

}  // namespace corvane
