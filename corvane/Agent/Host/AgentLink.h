#pragma once

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Agent/AgentMessage.h>
#include <corvane/Agent/FrameSocket.h>
#include <corvane/Agent/Host/AgentProgram.h>
#include <corvane/Agent/Host/AgentThread.h>
#include <corvane/Agent/Host/BackgroundTransferSession.h>

#include <poll.h>

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace corvane {

/// One session's connection to its transfer agent: starts the agent, connects, exchanges messages within the deadline,
/// and connects again when the agent was lost. Internal.
///
/// Owned by the session and the agent thread, on which everything but the constructor runs.
///
///     connecting -> greeting -> ready      a connection is made or an agent started; it is greeted; it has answered
///          ^           |          |
///          +-----------+----------+        the connection has ended: another one, until the deadline
///          |                               (a rule is broken, the deadline is over, it is no agent of ours:)
///          +- retry -- resting <- any      no agent is to be had; connects again only when it is told to
///                      closed  <- any      for good
class AgentLink {
  public:
    using Clock = std::chrono::steady_clock;

    /// How a link gets at its agent.
    struct Way {
        /// A connected, non-blocking socket; none, and `errno`, when nobody answers.
        std::function<Descriptor()> connect;
        /// Starts an agent, and waits for nothing. Throws `SystemError` when there can be none. Empty: an agent that
        /// does not run is not to be had, and nothing is logged of that.
        std::function<AgentProgram::Started()> start;
        /// Looks after the end of a process that was started.
        std::function<void(pid_t)> reap;
    };

    /// The way to the agent of a directory, which is made anew where it was removed: the agent needs it whole.
    [[nodiscard]] static Way wayTo(AgentDirectory directory, std::filesystem::path program,
                                   TransferAgentOptions options);

    /// Whoever hears what the agent says; called on the agent thread, never inside the constructor.
    class Listener {
      public:
        virtual ~Listener() = default;
        /// The connection stands, for the first time or again, and nothing was asked yet.
        virtual void agentIsReady() CORVANE_REQUIRES(agentThread) = 0;
        /// Whatever the agent says once it is ready, as it says it.
        virtual void agentSaid(const agent::Reply& reply) CORVANE_REQUIRES(agentThread) = 0;
        /// There is no agent to be had, and why.
        virtual void agentFailed(const std::string& why) CORVANE_REQUIRES(agentThread) = 0;
        /// The process exits: what the agent may not have heard is to be left where it finds it.
        virtual void processEnds() CORVANE_REQUIRES(agentThread) = 0;
    };

    /// Connects, or starts an agent, at once: one that was started goes on if the process is killed at this moment.
    /// Waits for neither. Throws what `Way::start` throws; `InvalidArgument` without one.
    AgentLink(Way way, std::chrono::milliseconds deadline, agent::Hello hello, Clock::time_point now);
    AgentLink(const AgentLink&) = delete;
    AgentLink& operator=(const AgentLink&) = delete;
    ~AgentLink();

    /// Before the link is attached to its thread.
    void setListener(std::weak_ptr<Listener> listener) { listener_ = std::move(listener); }

    /// Sends a request; dropped unless the link is ready. One that is answered begins an exchange, or makes the one
    /// that is under way longer.
    void send(agent::Request request, Clock::time_point now) CORVANE_REQUIRES(agentThread);
    /// Whether the agent has tasks whose end the listener waits for: then it has to show signs of life.
    void setAwaitsTasks(bool awaits) CORVANE_REQUIRES(agentThread) { awaitsTasks_ = awaits; }
    /// Lets a resting link connect again.
    void retry(Clock::time_point now) CORVANE_REQUIRES(agentThread);
    void close() CORVANE_REQUIRES(agentThread);
    /// The last call, at the exit of the process.
    void endOfProcess() CORVANE_REQUIRES(agentThread);

    [[nodiscard]] bool isReady() const CORVANE_REQUIRES(agentThread) { return state_ == State::ready; }
    [[nodiscard]] bool isClosed() const CORVANE_REQUIRES(agentThread) { return state_ == State::closed; }

    // For the agent thread.

    /// Reads and sends what can be, and does what is due.
    void proceed(Clock::time_point now) CORVANE_REQUIRES(agentThread);
    [[nodiscard]] pollfd polled() const CORVANE_REQUIRES(agentThread);
    [[nodiscard]] Clock::time_point nextDeadline() const CORVANE_REQUIRES(agentThread);

  private:
    enum class State { connecting, greeting, ready, resting, closed };

    /// Connects, or starts an agent where there is none to connect to.
    void attempt(Clock::time_point now) CORVANE_REQUIRES(agentThread);
    /// Goes on to `greeting` if somebody answers; otherwise notes why, and when to try again.
    bool connect(Clock::time_point now) CORVANE_REQUIRES(agentThread);
    /// Puts the next start off, for longer each time.
    void waitLonger(Clock::time_point now) CORVANE_REQUIRES(agentThread);
    /// Takes in what a program that was started says, until it closes the pipe.
    void readStarter(Clock::time_point now) CORVANE_REQUIRES(agentThread);
    /// The program has said all that it will: it is ready, or it is not to be had.
    void starterEnded(Clock::time_point now) CORVANE_REQUIRES(agentThread);
    void forgetStarter() CORVANE_REQUIRES(agentThread);
    /// Reads what has come in, and sends what waits.
    void exchange(Clock::time_point now) CORVANE_REQUIRES(agentThread);
    /// Takes one reply: the greeting itself, and an answer off the exchange; the listener has the rest.
    void take(const agent::Reply& reply, Clock::time_point now) CORVANE_REQUIRES(agentThread);
    /// Goes on to `ready`, unless the agent speaks another version.
    void greeted(const agent::Welcome& welcome) CORVANE_REQUIRES(agentThread);
    /// Gives up an agent that does not answer in time, and asks one that is silent for a sign of life.
    void checkDeadlines(Clock::time_point now) CORVANE_REQUIRES(agentThread);
    /// The connection has ended. Goes back to `connecting`; an agent that was ready is reported as lost.
    void lost(Clock::time_point now, const std::string& why) CORVANE_REQUIRES(agentThread);
    /// Goes on to `resting`, and tells the listener.
    void fail(const std::string& why) CORVANE_REQUIRES(agentThread);
    /// Why there is no connection yet, in the words that say most.
    [[nodiscard]] std::string whyNot() const CORVANE_REQUIRES(agentThread);

    // Constant once it is attached.
    const Way way_;
    const std::chrono::milliseconds deadline_;
    const agent::Hello hello_;
    std::weak_ptr<Listener> listener_;

    State state_ CORVANE_GUARDED_BY(agentThread) = State::connecting;
    std::optional<FrameSocket> socket_ CORVANE_GUARDED_BY(agentThread);
    AgentProgram::Started starter_ CORVANE_GUARDED_BY(agentThread);
    std::string starterSaid_ CORVANE_GUARDED_BY(agentThread);
    // In the words of the last program that was started, if it had any.
    std::string starterProblem_ CORVANE_GUARDED_BY(agentThread);
    // What the last attempt to connect came to.
    std::string problem_ CORVANE_GUARDED_BY(agentThread);
    // While there is no connection.
    Clock::time_point giveUpAt_ CORVANE_GUARDED_BY(agentThread);
    // While there is neither a connection nor a starter.
    Clock::time_point nextAttempt_ CORVANE_GUARDED_BY(agentThread);
    Clock::time_point lastHeard_ CORVANE_GUARDED_BY(agentThread);
    std::chrono::milliseconds restartDelay_ CORVANE_GUARDED_BY(agentThread){0};
    // What the log was told of an agent that is not to be had, until there is one.
    std::string complaint_ CORVANE_GUARDED_BY(agentThread);
    // Answers that the agent owes.
    std::size_t outstanding_ CORVANE_GUARDED_BY(agentThread) = 0;
    bool awaitsTasks_ CORVANE_GUARDED_BY(agentThread) = false;
};

}  // namespace corvane
