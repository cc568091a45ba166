#pragma once

#include <corvane/Bridge/Data/BridgedAccessTracker.h>
#include <corvane/Bridge/Data/BridgedDataEventClass.h>
#include <corvane/Bridge/Data/BridgedRawEvent.h>
#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Bridge/Models/BridgedError.h>
#include <corvane/Bridge/Session/BridgedEventProcessorType.h>
#include <corvane/Export.h>
#include <corvane/Models/Session.h>
#include <corvane/Tracker/SessionObserver.h>
#include <corvane/Tracker/Tracker.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <source_location>
#include <string>
#include <vector>

namespace corvane {

class BridgedEventMirrorStore;

/// An observation of session changes. Callers see it as `CVSessionObserver`. Letting go of it ends nothing: the
/// observation lasts as long as the object that bounds it, at first the tracker that was asked.
class CORVANE_EXPORT BridgedSessionObserver {
  public:
    explicit BridgedSessionObserver(std::shared_ptr<SessionObserver> sessionObserver);
    ~BridgedSessionObserver();

    /// Bounds the observation by the life of another object, which is held weakly. Any thread.
    void disposeOnObject(const std::shared_ptr<const void>& object);

  private:
    const std::shared_ptr<SessionObserver> sessionObserver_;
};

/// A tracker for callers who know their events and data by name only. Callers see it as `CVTracker`.
///
/// Each member means what its counterpart of `Tracker` means, and may be called where that may: from any thread, with
/// the work enqueued and the time of the call taken; blocks and completions run on the tracker's queue. Events come as
/// classes or raw. What is wrong with an event reaches its completion; other calls return false when they refuse their
/// arguments, log why, and fill `error` unless that is nullptr. Nothing throws.
///
/// Shared by the host. It keeps its library tracker alive; once the session manager is gone, submissions fail with the
/// error of a submission without a session, and everything else goes on.
///
///     auto tracker = sessions.tracker()->chainWithName("player");
///     tracker->pushDataEvent(std::make_shared<CVRawDataEvent>("Screen", CVDictionary{{"name", "home"}}));
///     tracker->submitRawEvent(view, false, [](const CVProcessEvent* event, const CVError* error) { ... });
class CORVANE_EXPORT BridgedTracker {
  public:
    using AccessBlock = std::function<void(const std::shared_ptr<BridgedAccessTracker>&)>;
    using SessionChangeBlock = std::function<void(const std::shared_ptr<BridgedAccessTracker>&, SessionChange)>;
    using Data = std::shared_ptr<const BridgedDataEventType>;

    /// Throws `BridgeError::missingObject` without a tracker.
    explicit BridgedTracker(std::shared_ptr<Tracker> tracker);
    BridgedTracker(const BridgedTracker&) = delete;
    BridgedTracker& operator=(const BridgedTracker&) = delete;
    ~BridgedTracker();

    [[nodiscard]] const std::string& name() const;
    /// The names from the root down to this tracker.
    [[nodiscard]] std::vector<std::string> path() const;
    /// The library's own tracker.
    [[nodiscard]] const std::shared_ptr<Tracker>& tracker() const { return tracker_; }

    /// Starts a timer, now or with a start time of the caller's. Refuses an event whose declaration cannot be used.
    bool timeEventType(const BridgedEventClass& eventType, bool submitAndRestartWithSession = false,
                       BridgedError* error = nullptr);
    bool timeEventType(const BridgedEventClass& eventType, Date startTime, bool submitAndRestartWithSession = false,
                       BridgedError* error = nullptr);
    bool timeRawEvent(const BridgedRawEvent& event, bool submitAndRestartWithSession = false,
                      BridgedError* error = nullptr);
    bool timeRawEvent(const BridgedRawEvent& event, Date startTime, bool submitAndRestartWithSession = false,
                      BridgedError* error = nullptr);

    void submitEventType(const BridgedEventClass& eventType, bool onlyIfTimed = false,
                         BridgedSubmitCompletion completion = {});
    void submitRawEvent(const BridgedRawEvent& event, bool onlyIfTimed = false,
                        BridgedSubmitCompletion completion = {});
    [[nodiscard]] std::shared_ptr<DelayedToken> delayedSubmitEventType(const BridgedEventClass& eventType,
                                                                       bool onlyIfTimed = false,
                                                                       BridgedSubmitCompletion completion = {});
    [[nodiscard]] std::shared_ptr<DelayedToken> delayedSubmitRawEvent(const BridgedRawEvent& event,
                                                                      bool onlyIfTimed = false,
                                                                      BridgedSubmitCompletion completion = {});
    void explicitSubmitEvent(const BridgedEventClass& eventType, Date submitTime, bool onlyIfTimed = false,
                             BridgedSubmitCompletion completion = {});
    void explicitSubmitRawEvent(const BridgedRawEvent& event, Date submitTime, bool onlyIfTimed = false,
                                BridgedSubmitCompletion completion = {});

    /// Puts data in scope. Its dictionary is asked for and converted before the call returns, on the caller's thread.
    /// A missing object and a name that is not UTF-8 change nothing. Data that cannot become JSON is refused too, but
    /// takes its place on the stack, and fails the events that find it with the same error.
    bool pushDataEvent(const Data& data, BridgedDataEventTraits traits = {}, BridgedError* error = nullptr,
                       std::source_location where = std::source_location::current());
    /// The same from a script, whose file and line are known at run time.
    bool pushDataEvent(const Data& data, BridgedDataEventTraits traits, std::string file, std::uint_least32_t line,
                       BridgedError* error = nullptr);
    /// The same for data whose dictionary is JSON already. What is not an object is refused and changes nothing.
    bool pushEncodedDataEvent(std::string dataName, JSON dictionary, BridgedDataEventTraits traits, std::string file,
                              std::uint_least32_t line, BridgedError* error = nullptr);
    /// Takes the newest data of a class, or name, that was pushed here through the bridge out of scope.
    void popDataEventType(const BridgedDataEventClass& dataType);
    void popDataEventByName(const std::string& dataName);

    /// Makes a child. Returns nullptr for a name that is not UTF-8.
    [[nodiscard]] std::shared_ptr<BridgedTracker> chainWithName(std::string name, BridgedError* error = nullptr);

    std::shared_ptr<BridgedSessionObserver> onSessionChangeWithBlock(SessionChangeBlock block);
    /// Ends every observation of `object`. A tracker's own observations are those of this object.
    void removeSessionObserversForObject(const std::shared_ptr<const void>& object);
    void removeSessionObserversForObject(const std::shared_ptr<BridgedTracker>& object);

    void transactionWithBlock(AccessBlock block);
    void whenSession(AccessBlock block);

    /// Refuses a name that is not UTF-8.
    bool enterGroupWithName(std::string groupName, BridgedError* error = nullptr);
    /// Enters a group whose name is empty.
    void enterGroup();
    void leaveGroup();

    void suspend();
    /// Requires: the queue is suspended (otherwise the process is stopped with a message).
    void resume();

  private:
    [[nodiscard]] EventSubmit eventSubmit(const BridgedEventClass& eventType) const;

    const std::shared_ptr<Tracker> tracker_;
    const std::shared_ptr<BridgedEventMirrorStore> eventMirrorStore_;
};

}  // namespace corvane
