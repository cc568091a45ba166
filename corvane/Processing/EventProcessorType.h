#pragma once

#include <corvane/Export.h>
#include <corvane/Models/ProcessEvent.h>
#include <corvane/Models/RejectedEvent.h>
#include <corvane/Models/Session.h>
#include <corvane/Platform/ForgottenRecords.h>

#include <functional>
#include <memory>
#include <string>

namespace corvane {

class SerialQueue;

/// Receives what a session manager records. Held by shared pointer and told apart by identity.
///
/// All callbacks but the first run on the access queue, one at a time, in the order of the host's calls. A callback
/// must not wait for that queue; what it throws is logged and the next processor is called. What wraps another
/// processor derives from `ForwardingEventProcessor`, which hands every callback on.
class CORVANE_EXPORT EventProcessorType {
  public:
    virtual ~EventProcessorType() = default;

    /// The queue on which all later callbacks run. Called once per addition, on the thread that adds the processor.
    virtual void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) = 0;
    virtual void process(const ProcessEvent& processEvent) = 0;

    virtual void didEnterGroup(const Group& /*group*/) {}
    virtual void didLeaveGroup(const Group& /*group*/) {}
    /// A session started, or was running when the processor was added.
    virtual void didStartSession(const Session& /*session*/) {}
    /// The session's data changed. `submitQueues` asks the processor to send what it has queued now.
    virtual void didUpdateSession(const Session& /*session*/, bool /*submitQueues*/) {}
    virtual void didEndSession(const Session& /*session*/, Date /*endDate*/) {}

    /// The submission of an event has failed.
    virtual void didReject(const RejectedEvent& /*event*/) {}
    /// Everything that was recorded is to be forgotten: the processor drops what it has and has not passed on. What the
    /// library keeps in the documents directory is removed besides. Returns how much it has dropped that was kept
    /// nowhere else.
    virtual ForgottenRecords forget() { return {}; }

    /// What tells this processor apart from others: itself, or what it stands for.
    [[nodiscard]] virtual const void* identity() const { return this; }

    /// Returns true when this processor owns the background transfer session `identifier` and takes the completion
    /// over, which it then calls when the session's events are delivered.
    virtual bool resumeBackgroundProcessing(const std::string& /*identifier*/,
                                            const std::function<void()>& /*completion*/) {
        return false;
    }

  protected:
    EventProcessorType() = default;
    EventProcessorType(const EventProcessorType&) = default;
    EventProcessorType& operator=(const EventProcessorType&) = default;
};

}  // namespace corvane
