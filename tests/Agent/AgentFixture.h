#pragma once

#include <corvane/Agent/Host/BackgroundTransferSession.h>

#include "tests/support/CapturedLog.h"
#include "tests/support/ScriptedServer.h"
#include "tests/support/TemporaryDocuments.h"

#include <gtest/gtest.h>

#include <chrono>
#include <condition_variable>
#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

namespace corvane::test {

using namespace std::chrono_literals;

/// Keeps what a session told it. Thread-safe.
class SessionRecorder final : public TransferSessionDelegate {
  public:
    void taskDidSendBodyData(const TransferTask&, std::int64_t, std::int64_t, std::int64_t) override;
    void taskDidComplete(const TransferTask& task, const std::optional<AnyError>& error,
                         const std::optional<TransferResponse>& response) override;
    void taskDidEndElsewhere(const TransferTask& task, const std::optional<AnyError>& error,
                             const std::optional<TransferResponse>& response) override;
    void allEventsDelivered() override;

    /// Called first by every completion, where it arrives. Set before the session is opened.
    std::function<void()> whenCompleted;

    /// Waits until so many completions came, also of tasks that ended elsewhere.
    [[nodiscard]] bool wait(std::size_t count) const;
    [[nodiscard]] bool waitForSignal() const;
    /// "200", or the kind of the error, by the description of the task; joined when it came more than once.
    [[nodiscard]] std::map<std::string, std::string> outcomes() const;
    /// The same of what was reported to another process.
    [[nodiscard]] std::map<std::string, std::string> elsewhere() const;
    /// How many completions had come before the signal did.
    [[nodiscard]] std::optional<std::size_t> completedAtSignal() const;
    [[nodiscard]] std::int64_t bytesSent() const;

  private:
    mutable std::mutex mutex_;
    mutable std::condition_variable changed_;
    std::map<std::string, std::string> outcomes_;
    std::map<std::string, std::string> elsewhere_;
    std::size_t completed_ = 0;
    std::int64_t sent_ = 0;
    std::optional<std::size_t> completedAtSignal_;
};

/// A directory with an agent, which is gone at the end.
class AgentFixture : public ::testing::Test {
  protected:
    AgentFixture();
    ~AgentFixture() override;

    std::shared_ptr<TransferSession> open(const std::shared_ptr<SessionRecorder>& recorder,
                                          const std::string& owner = "owner");
    std::shared_ptr<TransferSession> open(const std::shared_ptr<SessionRecorder>& recorder,
                                          TransferSessionConfiguration configuration);
    std::shared_ptr<TransferTask> upload(TransferSession& session, const std::string& url,
                                         const std::string& description);
    /// Descriptions of the running tasks.
    [[nodiscard]] static std::vector<std::string> running(TransferSession& session);
    std::filesystem::path body(const std::string& name, const std::string& contents = "the body");
    [[nodiscard]] std::size_t files(const std::string& folder) const;

    /// The agent of the directory, or 0.
    [[nodiscard]] static long agent(const std::filesystem::path& directory);
    [[nodiscard]] long agent() const { return agent(options.directory); }
    /// Processor time that a process has used, in the system's ticks.
    [[nodiscard]] static long processorTime(long process);
    void kill(int signal) const;
    /// Kills the agent of a directory and waits for its end.
    static void end(const std::filesystem::path& directory);

    TemporaryDocuments documents;
    CapturedLog log;
    ScriptedServer server;
    TransferAgentOptions options;
    std::shared_ptr<SessionRecorder> recorder = std::make_shared<SessionRecorder>();
};

/// Waits until a condition holds that nothing signals; false when it does not within the time.
[[nodiscard]] bool eventually(const std::function<bool()>& condition, std::chrono::milliseconds time = 10s);

/// How often each request body arrived.
[[nodiscard]] std::map<std::string, int> bodies(const ScriptedServer& server);

}  // namespace corvane::test
