#pragma once

#include <corvane/Models/ProcessEvent.h>
#include <corvane/Models/Session.h>

#include <memory>

namespace corvane {

class ActiveSessionType;
class SessionObserver;
struct RejectedEvent;

/// Who receives what trackers make: the session manager. Unless said otherwise, called on the trackers' queue.
class TrackerDelegate {
  public:
    virtual ~TrackerDelegate() = default;

    /// The active session, or nullptr. Good until the queue's task ends.
    [[nodiscard]] virtual const ActiveSessionType* activeSession() const = 0;
    virtual void process(const ProcessEvent& event) = 0;
    virtual void didReject(const RejectedEvent& event) = 0;

    /// Registers an observer. Any thread; takes effect on the queue.
    virtual void addSessionObserver(std::shared_ptr<SessionObserver> observer) = 0;
    /// Registers an observer at once.
    virtual void addSessionObserverNow(std::shared_ptr<SessionObserver> observer) = 0;
    /// Removes every observer whose object has the owner of `object`, and those whose object is gone. Any thread; takes
    /// effect on the queue.
    virtual void removeSessionObservers(std::weak_ptr<const void> object) = 0;

    virtual void didEnterGroup(const Group& group) = 0;
    virtual void didLeaveGroup(const Group& group) = 0;

    /// Any thread.
    virtual void suspend() = 0;
    /// Any thread.
    virtual void resume() = 0;
};

}  // namespace corvane
