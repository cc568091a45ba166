#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Error.h>
#include <corvane/Transfer/TransferResponse.h>

#include <cstdint>
#include <optional>

namespace corvane {

class TransferTask;

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

    /// A task is over; called once for every resumed task, as the last callback about it. Until it returns the task
    /// counts as running.
    /// @param error what went wrong, a `TransferError` as a rule; nothing when the server's answer is in.
    /// @param response the head of the answer. It may be there beside an error, when the connection broke inside the
    ///        answer's body.
    virtual void taskDidComplete(const TransferTask& task, const std::optional<AnyError>& error,
                                 const std::optional<TransferResponse>& response) = 0;

    /// A task is over, and the session of another process, of the same owner, was told by `taskDidComplete`: nothing is
    /// left to do for it here. Sessions outside the process only. Does nothing by default.
    /// @param error also when how the task ended is not known here, because that process has taken it over.
    virtual void taskDidEndElsewhere(const TransferTask& /*task*/, const std::optional<AnyError>& /*error*/,
                                     const std::optional<TransferResponse>& /*response*/) {}

    /// Everything that was pending when the host was woken has been delivered; see
    /// `TransferSession::deliverPendingEvents`.
    virtual void allEventsDelivered() = 0;
};

}  // namespace corvane
