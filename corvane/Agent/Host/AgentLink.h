#pragma once

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Agent/AgentMessage.h>
#include <corvane/Agent/FrameSocket.h>
#include <corvane/Agent/Host/AgentProgram.h>
#include <corvane/Agent/Host/TransferAgentOptions.h>
#include <corvane/Agent/TransferOutcome.h>

#include <poll.h>

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace corvane {

/// One session's connection to its transfer agent: starts the agent, connects, exchanges messages within the deadline,
/// and connects again when the agent was lost. Internal.
///
/// Owned by the session and the agent thread, on which everything but the constructor runs. The link is connecting,
/// ready, or resting after a failure; a resting one connects again only when it is told to, and a closed one never.
class AgentLink {
  public:
    using Clock = std::chrono::steady_clock;

    struct Task {
        std::string token;
        std::optional<std::string> description;
    };

    /// Whoever hears of what the agent says; called on the agent thread, never inside the constructor.
    class Listener {
      public:
        virtual ~Listener() = default;
        /// The connection stands, for the first time or again, and nothing was asked yet.
        virtual void agentIsReady() = 0;
        virtual void agentAccepted(const std::string& token) = 0;
        virtual void agentRefused(const std::string& token, const std::string& reason) = 0;
        virtual void agentListed(std::vector<Task> tasks) = 0;
        virtual void agentProgressed(const std::string& token, std::int64_t total, std::int64_t expected) = 0;
        virtual void agentCompleted(const Task& task, const TransferOutcome& outcome) = 0;
        virtual void agentForgot(const std::string& token) = 0;
        /// A task was reported by another process of the same owner; without an outcome it was taken back there.
        virtual void agentEndedElsewhere(const Task& task, const std::optional<TransferOutcome>& outcome) = 0;
        virtual void agentFlushed() = 0;
        /// There is no agent to be had; `isUsable` says no from before this call on.
        virtual void agentFailed() = 0;
        /// The process exits: what the agent may not have heard is to be left where it finds it.
        virtual void processEnds() = 0;
    };

    /// Connects, or starts an agent, at once: one that was started goes on if the process is killed at this moment.
    /// Waits for neither. Throws `SystemError` or `InvalidArgument` when there can be none: a directory that cannot be
    /// used, a program that cannot be started.
    AgentLink(AgentDirectory directory, std::filesystem::path program, TransferAgentOptions options,
              agent::Hello hello);
    AgentLink(const AgentLink&) = delete;
    AgentLink& operator=(const AgentLink&) = delete;
    ~AgentLink();

    void setListener(std::weak_ptr<Listener> listener) { listener_ = std::move(listener); }

    /// Sends a request; dropped unless the link is ready. `answers` of the agent end the exchange.
    void send(agent::Request message, std::size_t answers);
    /// Whether the agent has tasks whose end the listener waits for: then it has to show signs of life.
    void setAwaitsTasks(bool awaits) { awaitsTasks_ = awaits; }
    /// Lets a resting link connect again.
    void retry(Clock::time_point now);
    void close();
    /// The last call, at the exit of the process.
    void endOfProcess();

    [[nodiscard]] bool isReady() const { return state_ == State::ready; }
    [[nodiscard]] bool isClosed() const { return state_ == State::closed; }

    // For the agent thread.

    /// Reads and sends what can be, and does what is due.
    void proceed(Clock::time_point now);
    [[nodiscard]] pollfd polled() const;
    [[nodiscard]] Clock::time_point nextDeadline() const;

  private:
    enum class State { connecting, greeting, ready, resting, closed };

    void attempt(Clock::time_point now);
    bool connect(Clock::time_point now);
    void start();
    void waitLonger(Clock::time_point now);
    void readStarter(Clock::time_point now);
    void starterEnded(Clock::time_point now);
    void forgetStarter();
    void exchange(Clock::time_point now);
    void take(const agent::Reply& reply, Clock::time_point now);
    void greeted(const agent::Welcome& welcome);
    static void tell(const agent::Trouble& trouble);
    void checkDeadlines(Clock::time_point now);
    void lost(Clock::time_point now, const std::string& why);
    void fail(const std::string& why);
    void endExchange();

    // Constant after construction.
    const AgentDirectory directory_;
    const std::filesystem::path program_;
    const TransferAgentOptions options_;
    const agent::Hello hello_;
    std::weak_ptr<Listener> listener_;

    State state_ = State::connecting;
    std::optional<FrameSocket> socket_;
    AgentProgram::Started starter_;
    std::string starterSaid_;
    std::string starterProblem_;     // in the words of the last program that was started, if it had any
    std::string problem_;            // what the last attempt to connect came to
    Clock::time_point giveUpAt_;     // while there is no connection
    Clock::time_point nextAttempt_;  // while there is neither a connection nor a starter
    Clock::time_point lastHeard_;
    std::chrono::milliseconds restartDelay_{0};
    std::string complaint_;        // what the log was told of an agent that is not to be had, until there is one
    std::size_t outstanding_ = 0;  // answers that the agent owes
    std::vector<Task> listing_;
    bool awaitsTasks_ = false;
};

}  // namespace corvane
