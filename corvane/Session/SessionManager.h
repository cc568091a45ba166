#pragma once

#include <corvane/Export.h>
#include <corvane/Models/Session.h>
#include <corvane/Models/SessionData.h>
#include <corvane/Platform/ForgottenRecords.h>
#include <corvane/Processing/ProcessorManager.h>
#include <corvane/Session/AccessSessionManager.h>
#include <corvane/Tracker/Tracker.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <source_location>
#include <utility>

namespace corvane {

/// The object that a host makes first: it owns the queue on which all tracking runs, the root tracker and the processor
/// manager, and it starts and ends sessions.
///
/// Operations may be called from any thread; all but `endSync` enqueue their work and return at once. Starting while a
/// session is active, and ending while none is, does nothing.
///
/// The destructor lets everything that was called before it reach the processors, ends no session, waits for nothing,
/// and may run anywhere, in a block on the manager's own queue too. A suspended queue is resumed for it. What trackers
/// are asked afterwards fails with `TrackerError::noSession`.
///
/// A process that forks goes on as before. Its child may exec, or end with `_exit` or `exit`: the destructors and exit
/// handlers of what it has a copy of do nothing there, and nothing is recorded or sent twice. It must not use the
/// copies otherwise; a child that records events makes its own objects, and its parent makes none before it.
///
///     SessionManager sessions;
///     sessions.processorManager()->add(std::make_shared<LoggingEventProcessor>());
///     sessions.start(Session::Kind::userEvents());
class CORVANE_EXPORT SessionManager {
  public:
    SessionManager();
    SessionManager(const SessionManager&) = delete;
    SessionManager& operator=(const SessionManager&) = delete;
    ~SessionManager();

    /// The root tracker, named "root".
    [[nodiscard]] const std::shared_ptr<Tracker>& tracker() const;
    [[nodiscard]] const std::shared_ptr<ProcessorManager>& processorManager() const;

    /// Starts a session, whose start date is the time of the call.
    void start(Session::Kind kind);
    /// Ends the session; the end date is the time of the call. The completion, if any, is called on the queue, also
    /// when there was nothing to end.
    void end(std::function<void()> completion = {});
    /// Ends the session before it returns; does nothing at all while the queue is suspended.
    /// Requires: the caller is not on the queue (the process is stopped with a message).
    void endSync();

    /// Puts data into this and later sessions, under its key. Processors are told of it while a session is active;
    /// `submitEventQueues` asks them to send what they have collected so far under the data before this push.
    template <class D>
    CORVANE_LOCAL void push(SessionData<D> data, DataEventTraits traits = {}, bool submitEventQueues = false,
                            std::source_location where = std::source_location::current()) {
        if constexpr (detail::check(detail::searchDataEvent<detail::Use::later, D>())) {
            push({typeName<SessionData<D>>(), AnyDataEvent(std::move(data)), traits, where.file_name(), where.line()},
                 submitEventQueues);
        }
    }  // NOLINT(clang-analyzer-cplusplus.NewDeleteLeaks): the data counts its references

    /// Switches recording on or off, for every session manager of this process at once, and in the documents directory
    /// as it is set now: for every process that uses it, as soon as that next looks at its database or starts a
    /// session, and for later runs. It is on until this is called for the first time. Events submitted or processed
    /// while it is off fail with `TrackerError::notRecording` and consume nothing; data may be pushed, and sessions go
    /// on. What was recorded before stays, and is sent.
    ///
    /// The completion, if any, is called on the queue once the choice is on disk, with nullptr, or with the reason why
    /// it could not be written, which is logged too; it holds in this process all the same. Any thread; waits for
    /// nothing.
    void setRecording(bool isOn, std::function<void(const AnyError* error)> completion = {});
    /// Whether events are recorded now. Any thread.
    [[nodiscard]] bool isRecording() const;

    /// Forgets what was recorded so far and is not delivered, in the documents directory as it is set now: of every
    /// endpoint there, of all processes that use it, and of earlier runs. Open batches, stored documents, their
    /// payloads and all debugging copies are removed, and transfers are stopped, the transfer agent's too. What is
    /// recorded from now on is kept; whether to record, sessions, data and timers stay as they are, and so does what a
    /// processor of the host's keeps, unless it overrides `forget`.
    ///
    /// Submissions before this call are told to have succeeded first. Another process drops what it has in memory when
    /// it next looks at its database, and neither writes nor sends it; a transfer that runs inside it at this moment
    /// comes to its end. A kill in the midst of it is made good by the next session start of any process.
    ///
    /// The completion, if any, is called on the queue when it is done, with how much was dropped, and with the reason
    /// when something may be left, which is logged too and tried again when a session next starts; with nothing dropped
    /// if the beginning could not be written. Any thread; waits for nothing.
    void forget(std::function<void(const ForgottenRecords& forgotten, const AnyError* error)> completion = {});

    /// How many calls wait in memory: those of this manager, its trackers and its processor manager that were enqueued
    /// and have not begun to run. Exact at no moment, since others call and the queue works meanwhile; good for a
    /// producer that slows down. It does not fall while the queue is suspended, nor in a process that has no thread
    /// left for it, until the next call tries again: slow down for a while, and not until it has fallen. Any thread,
    /// blocks on the queue too; it waits for nothing, and may be asked before every call. In a child made by `fork` it
    /// is 0.
    [[nodiscard]] std::uint64_t waitingCount() const;

    /// Runs a block on the queue. What it throws is logged.
    void transaction(std::function<void(AccessSessionManager&)> block);

    /// The same for session data that is known by name.
    void push(AnyDataEventEntry entry, bool submitEventQueues);

  private:
    std::shared_ptr<SessionCore> core_;
};

}  // namespace corvane
