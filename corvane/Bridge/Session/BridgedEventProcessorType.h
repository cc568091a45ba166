#pragma once

#include <corvane/Bridge/Models/BridgedSession.h>
#include <corvane/Export.h>
#include <corvane/Models/ProcessEvent.h>
#include <corvane/Models/RejectedEvent.h>
#include <corvane/Models/Session.h>
#include <corvane/Platform/Date.h>
#include <corvane/Platform/ForgottenRecords.h>

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace corvane {

class SerialQueue;

/// A submitted event as processors and completions see it. Callers see it as `CVProcessEvent`. A value whose copies
/// share the JSON; may be read from any thread.
class BridgedProcessEvent {
  public:
    explicit BridgedProcessEvent(ProcessEvent processEvent) : processEvent_(std::move(processEvent)) {}

    [[nodiscard]] const std::string& name() const { return processEvent_.name(); }
    /// The format version of events.
    [[nodiscard]] std::string version() const { return std::string(ProcessEvent::version()); }
    [[nodiscard]] const JSON& json() const { return processEvent_.json(); }
    /// The innermost group the submitting tracker was in, or nothing.
    [[nodiscard]] const std::optional<std::string>& groupName() const { return processEvent_.groupName(); }

    /// The library's own event.
    [[nodiscard]] const ProcessEvent& processEvent() const { return processEvent_; }

  private:
    ProcessEvent processEvent_;
};

/// An event processor that an object-facing host implements. Callers see it as `CVEventProcessorType`. Held by shared
/// pointer and told apart by identity.
///
/// All callbacks but the first run on the session manager's queue, one at a time, in the order of the host's calls. A
/// callback must not wait for that queue; what it throws is logged and the next processor is called. A host implements
/// the first two and overrides those of the others that it wants to hear of.
class CORVANE_EXPORT BridgedEventProcessorType {
  public:
    virtual ~BridgedEventProcessorType() = default;

    /// The queue on which all later callbacks run. Called once per addition, on the thread that adds the processor;
    /// what it throws refuses the addition.
    virtual void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) = 0;
    virtual void processEvent(const BridgedProcessEvent& event) = 0;

    virtual void didEnterGroup(const Group& /*group*/) {}
    virtual void didLeaveGroup(const Group& /*group*/) {}
    /// A session started, or was running when the processor was added.
    virtual void didStartSession(const BridgedSession& /*session*/) {}
    /// The session's data changed. `submitEventQueues` asks the processor to send what it has queued now.
    virtual void didUpdateSession(const BridgedSession& /*session*/, bool /*submitEventQueues*/) {}
    virtual void didEndSession(const BridgedSession& /*session*/, Date /*endDate*/) {}

    /// The submission of an event has failed.
    virtual void didReject(const RejectedEvent& /*event*/) {}
    /// Everything that was recorded is to be forgotten: see `EventProcessorType::forget`.
    virtual ForgottenRecords forget() { return {}; }

    /// Returns true when this processor owns the background transfer session `identifier` and takes the completion
    /// over, which it calls when the session's events are delivered; nobody in the process waits for that. Not
    /// overridden, it returns false.
    virtual bool resumeBackgroundProcessingForIdentifier(const std::string& /*identifier*/,
                                                         const std::function<void()>& /*completion*/) {
        return false;
    }

  protected:
    BridgedEventProcessorType() = default;
    BridgedEventProcessorType(const BridgedEventProcessorType&) = default;
    BridgedEventProcessorType& operator=(const BridgedEventProcessorType&) = default;
};

}  // namespace corvane
