#pragma once

#include <corvane/Agent/Host/BackgroundTransferSession.h>

#include "tests/support/Testing.h"

#include <condition_variable>
#include <filesystem>
#include <mutex>

namespace corvane::test {

/// Keeps what a session told it. Thread-safe.
class SessionRecorder final : public TransferSessionDelegate {
  public:
    using Outcomes = std::map<std::string, std::string>;

    void taskDidSendBodyData(const TransferTask&, std::int64_t sent, std::int64_t total,
                             std::int64_t expected) override {
        bytesSent += sent;
        EXPECT_LE(total, expected);
    }
    void taskDidComplete(const TransferTask& task, const std::optional<AnyError>& error,
                         const std::optional<TransferResponse>& response) override {
        EXPECT_NE(task.state(), TransferTask::State::completed);
        if (whenCompleted) whenCompleted();
        note(outcomes_, task, error, response);
    }
    void taskDidEndElsewhere(const TransferTask& task, const std::optional<AnyError>& error,
                             const std::optional<TransferResponse>& response) override {
        note(elsewhere_, task, error, response);
    }
    void allEventsDelivered() override;

    /// Called first by every completion, where it arrives. Set before the session is opened.
    std::function<void()> whenCompleted;
    std::atomic<std::int64_t> bytesSent = 0;

    /// Waits until so many completions came, also of tasks that ended elsewhere.
    [[nodiscard]] bool wait(std::size_t count) const;
    /// Waits for the signal; how many completions had come before.
    [[nodiscard]] std::optional<std::size_t> waitForSignal() const;
    /// "200", or the kind of the error, by the description of the task; joined when it came more than once.
    [[nodiscard]] Outcomes outcomes() const { return std::lock_guard(mutex_), outcomes_; }
    /// The same of what was reported to another process.
    [[nodiscard]] Outcomes elsewhere() const { return std::lock_guard(mutex_), elsewhere_; }

  private:
    void note(Outcomes& where, const TransferTask& task, const std::optional<AnyError>& error,
              const std::optional<TransferResponse>& response);

    mutable std::mutex mutex_;
    mutable std::condition_variable changed_;
    Outcomes outcomes_, elsewhere_;
    std::size_t completed_ = 0;
    std::optional<std::size_t> completedAtSignal_;
};

/// A directory with an agent, which is gone at the end.
class AgentFixture : public ::testing::Test {
  protected:
    AgentFixture();
    ~AgentFixture() override;

    std::shared_ptr<TransferSession> open(const std::shared_ptr<SessionRecorder>& recorder,
                                          const std::string& owner = "owner");
    std::shared_ptr<TransferTask> upload(TransferSession& session, const std::string& url,
                                         const std::string& description, const std::string& contents = {});
    /// Descriptions of the running tasks.
    [[nodiscard]] static std::vector<std::string> running(TransferSession& session);
    std::filesystem::path body(const std::string& name, const std::string& contents = "the body");
    [[nodiscard]] std::size_t files(const std::string& folder) const {
        return filesIn(options.directory / folder).size();
    }
    /// How many processes have these among their arguments.
    [[nodiscard]] static std::size_t processes(const std::string& arguments);

    /// The agent of the directory, or 0.
    [[nodiscard]] static long agent(const std::filesystem::path& directory);
    [[nodiscard]] long agent() const { return agent(options.directory); }
    void kill(int signal) const;
    /// Kills the agent of a directory and waits for its end.
    static void end(const std::filesystem::path& directory);

    TemporaryDocuments documents;
    CapturedLog log;
    ScriptedServer server;
    TransferAgentOptions options;
    std::shared_ptr<SessionRecorder> recorder = std::make_shared<SessionRecorder>();
};

/// How often each request body arrived.
[[nodiscard]] std::map<std::string, int> bodies(const ScriptedServer& server);

}  // namespace corvane::test
