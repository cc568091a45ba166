#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Transfer/TransferRequest.h>
#include <corvane/Transfer/TransferSessionConfiguration.h>

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace corvane {

/// One upload of a transfer session.
///
/// Made by `TransferSession::uploadTask`, suspended; shared between the session, which holds it until its completion
/// callback has returned, and whoever asked for it. Letting go of a task does not stop it, and a task may outlive its
/// session: it then never runs. All operations may be called from any thread.
class CORVANE_EXPORT TransferTask {
  public:
    enum class State {
        running,     ///< resumed, and its completion callback has not returned yet
        suspended,   ///< not resumed yet
        cancelling,  ///< told to stop, not completed yet
        completed,   ///< over, and the delegate has been told
    };

    virtual ~TransferTask() = default;

    /// Unique in its session.
    [[nodiscard]] virtual std::int64_t identifier() const = 0;

    /// Text of the owner's, kept with the task also where tasks outlive the process.
    [[nodiscard]] virtual std::optional<std::string> description() const = 0;
    virtual void setDescription(std::string description) = 0;

    [[nodiscard]] virtual State state() const = 0;

    /// Starts a suspended task; a task in another state stays as it is. Failures of any kind are reported through the
    /// delegate, later.
    virtual void resume() = 0;

    /// Stops the task, and returns at once. A task that is not over yet completes through the delegate, once: with
    /// `TransferError` cancelled, and from then on nothing of its body is sent, or with what it had come to by then.
    /// One that was never resumed completes with cancelled too, and does not run any more. Until the completion
    /// callback has returned, the task's state is `cancelling`. A task that is over, or whose session has gone, stays
    /// as it is.
    ///
    /// Does nothing by default, for sessions of a host's own that cannot stop their tasks: these then end as they would
    /// have without.
    virtual void cancel() {}
};

/// Whoever a transfer session reports to. The session holds it weakly; every callback runs on the session's queue,
/// never inside a call to the session, and what it throws is logged.
class CORVANE_EXPORT TransferSessionDelegate {
  public:
    virtual ~TransferSessionDelegate() = default;

    /// Part of a task's body went out. Counts are bytes; sessions may report several steps as one.
    /// @param sent since the last report of this task.
    /// @param total since the task began; less than before never, also when a part had to be sent again.
    /// @param expected the size of the body.
    virtual void taskDidSendBodyData(const TransferTask& task, std::int64_t sent, std::int64_t total,
                                     std::int64_t expected) = 0;

    /// A task is over; called once for every task that was resumed or cancelled, as the last callback about it. Until
    /// it returns the task counts as running, or as cancelling.
    /// @param error what went wrong, a `TransferError` as a rule; nothing when the server's answer is in.
    /// @param response the head of the answer. It may be there beside an error, when the connection broke inside the
    ///        answer's body.
    virtual void taskDidComplete(const TransferTask& task, const std::optional<AnyError>& error,
                                 const std::optional<TransferResponse>& response) = 0;

    /// A task is over, and the session of another process, of the same owner, was told by `taskDidComplete`, or what it
    /// sent was discarded: nothing is left to do for it here. Sessions outside the process only. Does nothing by
    /// default.
    /// @param error also when how the task ended is not known here, because that process has taken it over.
    virtual void taskDidEndElsewhere(const TransferTask& /*task*/, const std::optional<AnyError>& /*error*/,
                                     const std::optional<TransferResponse>& /*response*/) {}

    /// Everything that was pending when the host was woken has been delivered; see
    /// `TransferSession::deliverPendingEvents`.
    virtual void allEventsDelivered() = 0;
};

/// Uploads files in the background: the seam behind which an agent outside the process can carry the transfers on when
/// the process has gone.
///
/// Owned by whoever made it, which is also the owner of its tasks. It holds its delegate weakly and its queue strongly.
/// All operations may be called from any thread, on the session's queue too. None of them calls back before it returns
/// or waits for a queue. Destroying a session cancels the transfers that run inside the process; nothing is reported of
/// them.
///
///     auto session = makeDefaultTransferSession({.identifier = "com.example.uploads"}, delegate, queue);
///     auto task = session->uploadTask({"https://example.com/in", "PUT", {{"Content-Type", "text/plain"}}}, file);
///     task->setDescription("report 7");
///     task->resume();                              // delegate->taskDidComplete(...) on the queue
class CORVANE_EXPORT TransferSession {
  public:
    /// Opens a session. An empty queue means one of the session's own.
    using Factory = std::function<std::shared_ptr<TransferSession>(
        TransferSessionConfiguration, std::weak_ptr<TransferSessionDelegate>, std::shared_ptr<SerialQueue>)>;
    using Listing = std::function<void(std::vector<std::shared_ptr<TransferTask>>)>;

    /// Replaces the way in which the library opens sessions for the whole process; an empty factory brings back its
    /// own: background sessions with the default options where the transfer agent is installed or was built with the
    /// library, and sessions inside the process otherwise. Call it before the first session is opened: sessions that
    /// are open stay as they are. Any thread.
    static void setFactory(Factory factory);
    /// The factory that was set, or an empty one. Any thread.
    [[nodiscard]] static Factory factory();

    virtual ~TransferSession() = default;

    /// Text of the owner's.
    [[nodiscard]] virtual std::optional<std::string> description() const = 0;
    virtual void setDescription(std::string description) = 0;

    /// Makes a suspended task that sends the file as the request's body. The file is opened when the transfer starts;
    /// one that is missing then fails the task.
    virtual std::shared_ptr<TransferTask> uploadTask(TransferRequest request, std::filesystem::path file) = 0;

    /// Lists the owner's tasks that are not completed, in the order in which they were made: `listing` is called once,
    /// on the session's queue, after the completion callbacks that were pending at the call.
    virtual void tasks(Listing listing) = 0;

    /// Tells the session that the host was woken for its events: what is pending is delivered, and then the delegate
    /// gets `allEventsDelivered` once for this call.
    virtual void deliverPendingEvents() = 0;
};

}  // namespace corvane
