#pragma once

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Agent/Host/AgentLink.h>
#include <corvane/Agent/Host/BackgroundTransferTask.h>
#include <corvane/Agent/Host/TransferAgentOptions.h>
#include <corvane/Transfer/InProcessTransferSession.h>
#include <corvane/Transfer/TransferSession.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

namespace corvane {

/// What a background session and its pending callbacks share: the tasks that are not completed, the link to the agent,
/// and the session inside the process that takes over when there is no agent. Internal.
///
/// Callable from any thread unless said otherwise; what the agent says arrives on the agent thread, what the delegate
/// is told runs on the session's queue. Nothing is called with the mutex held.
class BackgroundTransferCore final : public AgentLink::Listener,
                                     public TransferSessionDelegate,
                                     public std::enable_shared_from_this<BackgroundTransferCore> {
  public:
    using Task = BackgroundTransferTask;

    BackgroundTransferCore(TransferSessionConfiguration configuration, std::weak_ptr<TransferSessionDelegate> delegate,
                           std::shared_ptr<SerialQueue> queue, TransferAgentOptions options);

    /// Connects to the agent, or starts it; without one, says so in the log. Once, before anything else.
    void open();
    void close();

    [[nodiscard]] std::optional<std::string> description() const;
    void setDescription(std::string description);

    std::shared_ptr<Task> add(TransferRequest request, std::filesystem::path file);
    /// Hands a task that was resumed to the agent, or to the process.
    void start(const std::shared_ptr<Task>& task);
    void describe(std::string token, std::string description);
    void tasks(TransferSession::Listing listing);
    void deliverPendingEvents();

    // What the agent says.
    void agentIsReady() override;
    void agentAccepted(const std::string& token) override;
    void agentRefused(const std::string& token, const std::string& reason) override;
    void agentListed(std::vector<AgentLink::Task> tasks) override;
    void agentProgressed(const std::string& token, std::int64_t total, std::int64_t expected) override;
    void agentCompleted(const AgentLink::Task& task, const TransferOutcome& outcome) override;
    void agentForgot(const std::string& token) override;
    void agentEndedElsewhere(const AgentLink::Task& task, const std::optional<TransferOutcome>& outcome) override;
    void agentFlushed() override;
    void agentFailed() override;
    void processEnds() override;

    // What the session inside the process says of the tasks that it took over.
    void taskDidSendBodyData(const TransferTask& inner, std::int64_t sent, std::int64_t total,
                             std::int64_t expected) override;
    void taskDidComplete(const TransferTask& inner, const std::optional<AnyError>& error,
                         const std::optional<TransferResponse>& response) override;
    void allEventsDelivered() override {}

  private:
    using Clock = std::chrono::steady_clock;
    using Tasks = std::vector<std::shared_ptr<Task>>;

    [[nodiscard]] std::shared_ptr<AgentLink> makeLink(const std::filesystem::path& program);
    [[nodiscard]] std::string submission(const Task& task) const;
    [[nodiscard]] bool agentIsUsable();
    [[nodiscard]] bool mayBecomeReady() const;
    void leave();
    [[nodiscard]] static std::set<std::string>& acknowledged();
    [[nodiscard]] bool isReported(const std::string& token);
    void submitted(const std::string& token);
    void submit(const Task& task);
    void takeOver(const std::shared_ptr<Task>& task);
    void startInside(const std::shared_ptr<Task>& task);
    void takeBack(const std::shared_ptr<Task>& task, const char* why);
    void missed(const std::vector<AgentLink::Task>& listed);
    void listed(const std::vector<AgentLink::Task>& listed);
    void ask();
    void answer(TransferSession::Listing listing);
    void flush();
    void signal();
    void acknowledge(const std::string& token);
    void watch();
    void enqueueReport(const std::string& token, std::function<void()> report);
    void endElsewhere(std::shared_ptr<Task> task, const TransferOutcome& outcome);
    using Ending = void (TransferSessionDelegate::*)(const TransferTask&, const std::optional<AnyError>&,
                                                     const std::optional<TransferResponse>&);
    bool finish(Task& task, Ending ending, const std::optional<AnyError>& error,
                const std::optional<TransferResponse>& response);

    [[nodiscard]] Tasks openTasks() const;
    [[nodiscard]] std::shared_ptr<Task> find(const std::string& token) const;
    [[nodiscard]] std::shared_ptr<Task> adopt(const AgentLink::Task& task);
    [[nodiscard]] std::shared_ptr<Task> tookOver(const TransferTask& inner) const;
    [[nodiscard]] std::shared_ptr<TransferSessionDelegate> listener() const;
    void remove(const Task& task);

    // Constant once it is open.
    const TransferSessionConfiguration configuration_;
    const std::weak_ptr<TransferSessionDelegate> delegate_;
    const std::shared_ptr<SerialQueue> queue_;
    const TransferAgentOptions options_;
    std::optional<AgentDirectory> directory_;
    std::shared_ptr<AgentLink> link_;

    mutable std::mutex mutex_;  // guards these
    std::optional<std::string> description_;
    std::map<std::int64_t, std::shared_ptr<Task>> tasks_;
    std::unordered_map<std::string, std::shared_ptr<Task>> tokens_;  // the same
    std::int64_t lastIdentifier_ = 0;
    bool closed_ = false;
    bool agentUsable_ = false;
    Clock::time_point restUntil_;
    std::shared_ptr<InProcessTransferSession> inside_;
    std::map<std::int64_t, std::shared_ptr<Task>> takenOver_;  // by the identifier that they have inside

    // The agent thread's own.
    std::vector<std::pair<std::uint64_t, TransferSession::Listing>> listings_;  // with the question that answers them
    std::uint64_t asked_ = 0;
    std::uint64_t answered_ = 0;
    int flushes_ = 0;
    std::set<std::string> reported_;  // tokens whose report was enqueued, and that the agent still knows
};

}  // namespace corvane
