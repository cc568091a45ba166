#pragma once

#include <corvane/Bridge/Session/BridgedEventProcessorType.h>
#include <corvane/Export.h>
#include <corvane/Processing/EventProcessorType.h>

#include <functional>
#include <memory>
#include <string>

namespace corvane {

/// A processor of the library's for object-facing hosts, which add it like one of their own: hands every callback on,
/// with its arguments as the library sees them. The base of those below, and of no use by itself.
class CORVANE_EXPORT BridgingEventProcessor : public BridgedEventProcessorType {
  public:
    ~BridgingEventProcessor() override;

    void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) override;
    void processEvent(const BridgedProcessEvent& event) override;
    void didEnterGroup(const Group& group) override;
    void didLeaveGroup(const Group& group) override;
    void didStartSession(const BridgedSession& session) override;
    void didUpdateSession(const BridgedSession& session, bool submitEventQueues) override;
    void didEndSession(const BridgedSession& session, Date endDate) override;
    void didReject(const RejectedEvent& event) override;
    ForgottenRecords forget() override;
    bool resumeBackgroundProcessingForIdentifier(const std::string& identifier,
                                                 const std::function<void()>& completion) override;

  protected:
    explicit BridgingEventProcessor(std::shared_ptr<EventProcessorType> eventProcessor);
    BridgingEventProcessor(const BridgingEventProcessor&) = default;
    BridgingEventProcessor& operator=(const BridgingEventProcessor&) = delete;

  private:
    const std::shared_ptr<EventProcessorType> eventProcessor_;
};

}  // namespace corvane
