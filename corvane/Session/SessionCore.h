#pragma once

#include <corvane/Platform/AtomicCounter.h>
#include <corvane/Platform/ForkMark.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Processing/Forgetting.h>
#include <corvane/Processing/ProcessorManager.h>
#include <corvane/Session/ActiveSession.h>
#include <corvane/Tracker/DataEventStacks.h>
#include <corvane/Tracker/SessionObserver.h>
#include <corvane/Tracker/Tracker.h>
#include <corvane/Tracker/TrackerDelegate.h>

#include <functional>
#include <memory>
#include <string>
#include <variant>
#include <vector>

namespace corvane {

/// The session state machine behind `SessionManager`. Internal.
///
/// Shared between the handle, transactions and the tasks on its queue, where everything below runs unless it says that
/// it may be called from any thread. States: none, then active and finished in turns.
class SessionCore final : public TrackerDelegate,
                          public SessionProviderType,
                          public std::enable_shared_from_this<SessionCore> {
  public:
    [[nodiscard]] static std::shared_ptr<SessionCore> make();
    ~SessionCore() override;

    // Constant after construction.
    [[nodiscard]] const std::shared_ptr<SerialQueue>& accessQueue() const { return accessQueue_; }
    [[nodiscard]] const std::shared_ptr<Tracker>& tracker() const { return tracker_; }
    [[nodiscard]] const std::shared_ptr<ProcessorManager>& processorManager() const { return processorManager_; }

    /// Any thread: gives back every suspension and takes no more, so that what is enqueued runs.
    void close();
    /// Any thread: whether this is a copy in a child made by `fork`, where nothing runs and locks may stay locked.
    [[nodiscard]] bool isInForkedChild() const { return born_.isInChild(); }
    /// Any thread.
    [[nodiscard]] bool isSuspended() const { return suspendCount_.value() >= 1; }

    void start(Session::Kind kind, Date startDate);
    void end(Date endDate);
    void push(AnyDataEventEntry entry, bool submitEventQueues);
    void forget(ForgetCompletion completion);
    /// The session manager is gone: whoever else still holds this, no session is active any more, and none has ended.
    void abandon();
    [[nodiscard]] bool isActive() const { return activeSession() != nullptr; }

    // TrackerDelegate
    [[nodiscard]] const ActiveSessionType* activeSession() const override;
    void process(const ProcessEvent& event) override;
    void didReject(const RejectedEvent& event) override;
    void addSessionObserver(std::shared_ptr<SessionObserver> observer) override;
    void addSessionObserverNow(std::shared_ptr<SessionObserver> observer) override;
    void removeSessionObservers(std::weak_ptr<const void> object) override;
    void didEnterGroup(const Group& group) override;
    void didLeaveGroup(const Group& group) override;
    void suspend() override;
    void resume() override;

    // SessionProviderType
    [[nodiscard]] std::optional<Session> currentSession() const override;

  private:
    struct None {};
    using SessionState = std::variant<std::unique_ptr<ActiveSession>, Session, None>;

    SessionCore();

    /// The record of the active session as of now, for processors.
    [[nodiscard]] Session sessionOf(const ActiveSession& active) const;
    /// The session's dictionary: its identifier, and what lies on top of each stack of session data. Encodes host data,
    /// whose code may push meanwhile.
    [[nodiscard]] JSON sessionData(const std::string& identifier) const;
    /// Tells the observers that are registered now of a step, in the order of their registration.
    void announce(SessionChange change);
    /// After a session's end: takes data with the trait `onlyOnce` off its stack, and drops empty stacks.
    void pruneOnceOnlyData();
    /// Drops the observers for which `isOver` holds; what their blocks hold is destroyed last.
    template <class Predicate>
    void dropObservers(Predicate isOver);

    const ForkMark born_;
    const std::shared_ptr<SerialQueue> accessQueue_;
    std::shared_ptr<Tracker> tracker_;
    const std::shared_ptr<ProcessorManager> processorManager_;

    AtomicCounter suspendCount_;
    Mutex suspensionMutex_;  // keeps the count and the queue's own in step; never held while a task runs
    bool closed_ CORVANE_GUARDED_BY(suspensionMutex_) = false;

    SessionState state_ CORVANE_GUARDED_BY(*accessQueue_) = None{};
    DataEventStacks dataStacks_ CORVANE_GUARDED_BY(*accessQueue_);
    // In the order of registration; those whose object is gone are dropped once the list has doubled.
    std::vector<std::shared_ptr<SessionObserver>> observers_ CORVANE_GUARDED_BY(*accessQueue_);
    std::size_t pruneAt_ CORVANE_GUARDED_BY(*accessQueue_) = 16;
};

}  // namespace corvane
