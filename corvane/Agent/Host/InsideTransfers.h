#pragma once

#include <corvane/Agent/Host/TaskTable.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Transfer/InProcessTransferSession.h>
#include <corvane/Transfer/SessionReporter.h>

#include <cstdint>
#include <memory>
#include <optional>

namespace corvane {

/// The tasks of a background session that run inside the process, because there is no agent: a session of that kind,
/// made when it is first needed, whose tasks are described by the tokens of ours. Internal; callable from any thread.
class InsideTransfers final : public TransferSessionDelegate, public std::enable_shared_from_this<InsideTransfers> {
  public:
    InsideTransfers(TransferSessionConfiguration configuration, std::shared_ptr<SessionReporter> reporter,
                    std::shared_ptr<TaskTable> tasks);

    /// Starts a task inside the process, unless it is past that; one that was cancelled ends there at once. One that
    /// cannot be started has failed: nobody else would end it.
    void takeOver(const std::shared_ptr<BackgroundTransferTask>& task);
    /// Cancels what runs; nothing more is started.
    void close();

    // What the session inside the process says.
    void taskDidSendBodyData(const TransferTask& inner, std::int64_t sent, std::int64_t total,
                             std::int64_t expected) override;
    void taskDidComplete(const TransferTask& inner, const std::optional<AnyError>& error,
                         const std::optional<TransferResponse>& response) override;
    void allEventsDelivered() override {}

  private:
    [[nodiscard]] std::shared_ptr<InProcessTransferSession> session();
    void start(BackgroundTransferTask& task);
    void end(BackgroundTransferTask& task, const TransferOutcome& outcome);

    const TransferSessionConfiguration configuration_;
    const std::shared_ptr<SessionReporter> reporter_;
    const std::shared_ptr<TaskTable> tasks_;

    Mutex mutex_;
    std::shared_ptr<InProcessTransferSession> session_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane
