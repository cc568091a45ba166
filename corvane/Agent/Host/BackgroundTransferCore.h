#pragma once

#include <corvane/Agent/Host/AgentConversation.h>
#include <corvane/Agent/Host/BackgroundTransferSession.h>
#include <corvane/Agent/Host/BackgroundTransferTask.h>
#include <corvane/Agent/Host/InsideTransfers.h>
#include <corvane/Agent/Host/TaskTable.h>
#include <corvane/Transfer/Description.h>
#include <corvane/Transfer/SessionReporter.h>
#include <corvane/Transfer/TransferSession.h>

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

namespace corvane {

/// What a background session and its tasks share: hands tasks that are resumed to the agent, over the spool, or to the
/// process. Internal.
///
/// Callable from any thread; never calls back inside a call.
class BackgroundTransferCore final : public std::enable_shared_from_this<BackgroundTransferCore> {
  public:
    using Task = BackgroundTransferTask;

    BackgroundTransferCore(TransferSessionConfiguration configuration, std::weak_ptr<TransferSessionDelegate> delegate,
                           std::shared_ptr<SerialQueue> queue, TransferAgentOptions options);

    /// Connects to the agent, or starts it; without one, says so in the log. Once, before anything else.
    void open();
    void close();

    /// Text of the session's owner.
    Description description;

    std::shared_ptr<Task> add(TransferRequest request, std::filesystem::path file);
    /// Hands a task that was resumed to the agent, or to the process.
    void start(const std::shared_ptr<Task>& task);
    /// Stops a task that was just marked as cancelled.
    void cancel(const std::shared_ptr<Task>& task);
    void describe(std::string token, std::string text);
    void tasks(TransferSession::Listing listing);
    void deliverPendingEvents();

  private:
    [[nodiscard]] std::shared_ptr<AgentConversation> converse(const std::filesystem::path& program);
    [[nodiscard]] std::vector<std::string> wakeCommand() const;
    /// Writes a task's submission into the spool. False, and says so in the log, when it cannot.
    [[nodiscard]] bool spool(const Task& task);
    [[nodiscard]] std::string submission(const Task& task) const;
    [[nodiscard]] bool agentIsUsable() const { return conversation_ && conversation_->isUsable(); }

    // Constant once it is open.
    const TransferSessionConfiguration configuration_;
    const TransferAgentOptions options_;
    const std::shared_ptr<SessionReporter> reporter_;
    const std::shared_ptr<TaskTable> tasks_;
    const std::shared_ptr<InsideTransfers> inside_;
    std::shared_ptr<AgentConversation> conversation_;  // none without an agent
};

}  // namespace corvane
