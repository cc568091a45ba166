#pragma once

#include <corvane/Export.h>
#include <corvane/Models/AnyDataEventEntry.h>
#include <corvane/Models/EventProperty.h>
#include <corvane/Models/EventSubmit.h>
#include <corvane/Models/Session.h>
#include <corvane/Platform/Date.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Platform/ThreadAnnotations.h>
#include <corvane/Snapshot/SnapshotType.h>
#include <corvane/Tracker/EventSubmitResult.h>
#include <corvane/Tracker/TrackerError.h>

#include <functional>
#include <memory>
#include <optional>
#include <source_location>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace corvane {

class AccessTracker;
class SessionObserver;
class TrackerDelegate;
class EventIdentity;
struct Sequence;
struct SnapshotLevel;
struct TrackerTimer;

/// Records events, and holds the context data that they carry.
///
/// Trackers form chains: the session manager owns the root, and any tracker makes children with `chain`. A child keeps
/// its parent alive; a parent does not know its children. Data pushed on a tracker is in scope for it and for all below
/// it: an event takes each property from the nearest tracker that has data of that type, the newest first.
///
/// Hosts hold trackers by shared pointer. Unless said otherwise, operations may be called from any thread, enqueue
/// their work on the queue that the chain and the session manager share, and return at once; the time that an event, a
/// timer or a group carries is the time of the call. When the session manager is gone, submissions fail with
/// `TrackerError::noSession` and everything else goes on.
///
///     auto player = sessions.tracker()->chain("player");
///     player->push(Screen{"home"});
///     player->submit<ScreenView>();
class CORVANE_EXPORT Tracker : public std::enable_shared_from_this<Tracker> {
  public:
    using Timer = TrackerTimer;

    /// Called on the queue with a handle on the tracker and the change.
    using SessionChangeBlock = std::function<void(AccessTracker&, SessionChange)>;

    Tracker(const Tracker&) = delete;
    Tracker& operator=(const Tracker&) = delete;
    ~Tracker();

    /// Makes a child with the same queue. Runs on the caller's thread.
    [[nodiscard]] std::shared_ptr<Tracker> chain(std::string name);

    [[nodiscard]] const std::string& name() const { return name_; }
    /// The names from the root down to this tracker. Runs on the caller's thread.
    [[nodiscard]] std::vector<std::string> path() const;

    /// Submits an event. The completion, if any, is called once on the queue, in the order of the submissions and
    /// before anything else that is enqueued after them; submissions that are at hand together share their writes, and
    /// their completions run behind these.
    template <class E>
    CORVANE_LOCAL void submit(EventSubmitCompletion completion = {}) {
        submit(EventSubmit::actual<E>(), now(), {.completion = std::move(completion)});
    }
    template <class E>
    CORVANE_LOCAL void submit(SubmitOptions options) {
        submit(EventSubmit::actual<E>(), now(), std::move(options));
    }
    /// Submits an event of another time than now.
    template <class E>
    CORVANE_LOCAL void explicitSubmit(Date submitTime, EventSubmitCompletion completion = {}) {
        submit(EventSubmit::actual<E>(), submitTime, {.completion = std::move(completion)});
    }

    /// Prepares a submission that carries the time of this call, and that the token's `commit` makes.
    template <class E>
    [[nodiscard]] CORVANE_LOCAL std::shared_ptr<DelayedToken> delayedSubmit(EventSubmitCompletion completion = {}) {
        return delayedSubmit(EventSubmit::actual<E>(), {.completion = std::move(completion)});
    }
    template <class E>
    [[nodiscard]] CORVANE_LOCAL std::shared_ptr<DelayedToken> delayedSubmit(SubmitOptions options) {
        return delayedSubmit(EventSubmit::actual<E>(), std::move(options));
    }

    /// Starts a timer, which ends with the next submission of `E` on this tracker if `E` requires `TimedData`. Ignored
    /// while one runs. With the flag, the event is also submitted when a session is about to end, and timed anew when
    /// the next one has started.
    template <class E>
    CORVANE_LOCAL void time(bool submitAndRestartWithSession = false) {
        time(EventSubmit::actual<E>(), now(), submitAndRestartWithSession);
    }
    /// Starts a timer that has run since `startTime`.
    template <class E>
    CORVANE_LOCAL void explicitTime(Date startTime) {
        time(EventSubmit::actual<E>(), startTime, false);
    }

    /// Puts data in scope, under the name of its type. An event that finds it encodes it; what cannot be encoded fails
    /// that event's submission. The data is kept: a declaration that refers to what is somebody else's, such as a view,
    /// or that would not be written as it reads, is refused by the compiler with the name of the field.
    template <class D>
    CORVANE_LOCAL void push(D data, DataEventTraits traits = {},
                            std::source_location where = std::source_location::current()) {
        if constexpr (detail::check(detail::searchDataEvent<detail::Use::later, D>())) {
            push({typeName<D>(), AnyDataEvent(std::move(data)), traits, where.file_name(), where.line()});
        }
    }  // NOLINT(clang-analyzer-cplusplus.NewDeleteLeaks): the data counts its references
    /// Takes the newest data of a type that was pushed on this very tracker out of scope; nothing if there is none.
    template <class D>
    CORVANE_LOCAL void pop() {
        pop(typeName<D>(), DataType::of<D>());
    }

    /// Enters a group: every event submitted on this tracker or below carries the innermost group's name.
    void enterGroup(std::string groupName);
    /// Leaves the innermost group of the nearest tracker that has one, this one or above; nothing if there is none.
    void leaveGroup();

    /// Copies the data and timers in scope. Waits for the queue.
    /// Requires: the caller is not on the queue (the process is stopped with a message).
    [[nodiscard]] std::shared_ptr<const SnapshotType> snapshot(SnapshotPolicy policy);

    /// Runs a block on the queue, in one piece with nothing in between. What it throws is logged.
    void transaction(std::function<void(AccessTracker&)> block);
    /// Runs a block on the queue as soon as a session is active: now, or when the next one has started; once.
    void whenSession(std::function<void(AccessTracker&)> block);

    /// Observes session changes for as long as this tracker lives, or the object given to the observer's `disposeOn`.
    std::shared_ptr<SessionObserver> onSessionChange(SessionChangeBlock block);
    /// Ends every observation of `object`, and of what shares its ownership with it.
    void removeSessionObservers(const std::shared_ptr<const void>& object);

    /// Stops the whole queue after the task that runs, until as many `resume` calls; counted by the session manager.
    /// Runs on the caller's thread; nothing without a session manager.
    void suspend();
    void resume();

    // The same for events and data that are known by declaration and name.
    void submit(EventSubmit event, Date submitTime, SubmitOptions options);
    [[nodiscard]] std::shared_ptr<DelayedToken> delayedSubmit(EventSubmit event, SubmitOptions options);
    void time(EventSubmit event, Date startTime, bool submitAndRestartWithSession);
    void push(AnyDataEventEntry entry);
    void pop(std::string_view key, DataType type);

  private:
    friend class AccessTracker;
    friend class SessionCore;
    struct Scope;  // what the tracker holds: data, timers, groups

    Tracker(std::string name, std::shared_ptr<SerialQueue> accessQueue, std::shared_ptr<EventMirrorStore> mirrorStore,
            std::shared_ptr<Tracker> parent, std::weak_ptr<TrackerDelegate> delegate);

    /// Makes a tracker; one with a parent takes its queue, store and delegate from it and observes session changes.
    static std::shared_ptr<Tracker> makeRoot(std::string name, std::shared_ptr<SerialQueue> accessQueue,
                                             std::weak_ptr<TrackerDelegate> delegate);
    static void release(Tracker* tracker) noexcept;

    // On the queue.
    /// Whether a session is active and no timer runs that the submission asks for.
    [[nodiscard]] bool isUntimed(const EventSubmit& event) const;
    /// Resolves, validates and hands on.
    /// @param isRecorded whether recording was on when the event was submitted
    EventSubmitResult performSubmit(const EventSubmit& event, Date submitTime, bool isRecorded = true);
    /// The whole submission in one piece, with its writes and its completion.
    void submitNow(const EventSubmit& event, Date submitTime, const SubmitOptions& options);
    void performTime(const EventSubmit& event, Date startTime, bool submitAndRestartWithSession);
    void performPush(AnyDataEventEntry entry);
    void performPop(std::string_view key, DataType type);
    void performEnterGroup(Group group);
    void performLeaveGroup();
    void performWhenSession(std::function<void(AccessTracker&)> block);
    void react(SessionChange change);
    [[nodiscard]] std::vector<SnapshotLevel> levels(SnapshotPolicy policy);

    ProcessEvent process(const EventSubmit& event, Date submitTime, TrackerDelegate& delegate,
                         const std::string& sessionID);
    Sequence resolve(const std::vector<EventMirrorProperty>& properties, const EventSubmit& event, Date submitTime,
                     const std::string& sessionID);
    std::optional<AnyDataEvent> span(const EventPropertyType& property, const EventSubmit& event, Date submitTime);
    std::optional<AnyDataEvent> lookup(std::string_view key);
    void reportOtherType(std::string_view name, const EventPropertyType& property, DataType found);
    std::optional<std::string> groupName();
    std::shared_ptr<const EventIdentity> identity(const std::string& sessionID);

    const std::string name_;
    const std::shared_ptr<SerialQueue> accessQueue_;
    const std::shared_ptr<EventMirrorStore> eventMirrorStore_;
    std::shared_ptr<Tracker> parentTracker_;  // until it is released
    const std::weak_ptr<TrackerDelegate> delegate_;

    const std::unique_ptr<Scope> scope_ CORVANE_PT_GUARDED_BY(*accessQueue_);
};

}  // namespace corvane
