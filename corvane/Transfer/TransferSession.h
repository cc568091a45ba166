#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Transfer/TransferRequest.h>
#include <corvane/Transfer/TransferSessionConfiguration.h>
#include <corvane/Transfer/TransferSessionDelegate.h>
#include <corvane/Transfer/TransferTask.h>

#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace corvane {

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
