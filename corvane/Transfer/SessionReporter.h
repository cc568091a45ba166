#pragma once

#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Transfer/OwnDelegate.h>
#include <corvane/Transfer/SessionTask.h>
#include <corvane/Transfer/TransferOutcome.h>
#include <corvane/Transfer/TransferSession.h>

#include <atomic>
#include <cstdint>
#include <deque>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace corvane {

/// Tells a session's delegate what its tasks come to, on the session's queue, until the session is closed: the one
/// place where that happens, for every kind of session. Internal.
///
/// Shared by the session and what it has enqueued. Callable from any thread unless said otherwise; never calls back
/// inside a call.
class SessionReporter : public std::enable_shared_from_this<SessionReporter> {
  public:
    /// How the delegate is told of an end: by which of its callbacks.
    using Ending = void (TransferSessionDelegate::*)(const TransferTask&, const std::optional<AnyError>&,
                                                     const std::optional<TransferResponse>&);
    /// What follows an end that was enqueued, on the queue. `told` as `reportEnd` returns it.
    using Afterwards = std::function<void(bool told)>;
    /// Lists the session's tasks that are not completed.
    using List = std::function<std::vector<std::shared_ptr<TransferTask>>()>;

    /// An empty `queue` means one of the session's own.
    SessionReporter(std::weak_ptr<TransferSessionDelegate> delegate, std::shared_ptr<SerialQueue> queue);

    [[nodiscard]] const std::shared_ptr<SerialQueue>& queue() const { return queue_; }
    /// Nothing is told any more, but for a callback that runs at this moment.
    void close();
    [[nodiscard]] bool isClosed() const;
    /// The delegate, unless it or the session has gone.
    [[nodiscard]] std::shared_ptr<TransferSessionDelegate> delegate() const;

    /// Enqueues what tells the delegate something, ahead of work that waits on the queue and behind other reports: a
    /// backlog of events must not keep documents on disk that are delivered.
    void enqueue(Task report);

    /// Enqueues what tells of a task's end. A delegate that takes completions together gets those that are at hand by
    /// then in one call.
    void enqueueEnd(std::shared_ptr<SessionTask> task, Ending ending, TransferOutcome outcome, Afterwards afterwards);

    /// Tells of a task's end, once, and completes the task when the callback has come back, whatever it throws: until
    /// then the task counts as running. On the queue. Returns whether the delegate was told; a task of which nobody was
    /// told is not completed.
    bool reportEnd(SessionTask& task, Ending ending, const TransferOutcome& outcome);

    /// Whether anybody wants to know how much of a body has gone out.
    [[nodiscard]] bool wantsProgress() const;
    /// Enqueues a report of how much has gone out, unless one waits already or nobody wants to know.
    void reportProgress(std::shared_ptr<SessionTask> task, std::int64_t total, std::int64_t expected);

    /// Enqueues the word that all uploads to a server are held up, or go on, for a delegate of the library's own.
    void reportHoldUp(const std::string& server, bool lasts);

    /// Answers a question for the session's tasks through the queue, behind the completions that wait there.
    void answer(TransferSession::Listing listing, List list);

    /// Enqueues the word that all events were delivered.
    void signalDelivered();

  private:
    /// An end that waits in the queue.
    struct Waiting {
        std::shared_ptr<SessionTask> task;
        Ending ending;
        TransferOutcome outcome;
        Afterwards afterwards;
    };

    /// Reports the next end that waits, with those behind it that the delegate takes together with it.
    void reportNext();
    [[nodiscard]] std::vector<Waiting> takeNext(bool together);
    void reportTogether(OwnDelegate& delegate, const std::vector<Waiting>& ends);

    const std::weak_ptr<TransferSessionDelegate> delegate_;
    const std::shared_ptr<SerialQueue> queue_;
    // Constant after construction.
    bool isOwn_ = false;  // the delegate is an OwnDelegate
    std::shared_ptr<const std::atomic<bool>> progressIsWanted_;

    mutable Mutex mutex_;
    std::deque<Waiting> ends_ CORVANE_GUARDED_BY(mutex_);
    bool closed_ CORVANE_GUARDED_BY(mutex_) = false;
};

}  // namespace corvane
