#pragma once

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Agent/AgentMessage.h>
#include <corvane/Agent/Host/AgentLink.h>
#include <corvane/Agent/Host/AgentQuestions.h>
#include <corvane/Agent/Host/InsideTransfers.h>
#include <corvane/Agent/Host/TaskTable.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Transfer/SessionReporter.h>

#include <chrono>
#include <memory>
#include <optional>
#include <set>
#include <string>

namespace corvane {

/// What a background session and its agent say to each other about the session's tasks: takes them through the stages
/// between the spool and the report, and takes them back when there is no agent to be had. Internal.
///
/// Shared by the session's core and what has been posted to the agent thread, on which all of it happens; callable from
/// any thread unless said otherwise.
class AgentConversation final : public AgentLink::Listener, public std::enable_shared_from_this<AgentConversation> {
  public:
    using Clock = AgentLink::Clock;
    using Task = BackgroundTransferTask;

    /// What the conversation is about: the parts of the session.
    struct Session {
        std::weak_ptr<BackgroundTransferCore> core;
        std::shared_ptr<TaskTable> tasks;
        std::shared_ptr<SessionReporter> reporter;
        std::shared_ptr<InsideTransfers> inside;
    };

    AgentConversation(AgentDirectory directory, std::shared_ptr<AgentLink> link, std::chrono::milliseconds holdOff,
                      Session session);

    /// Lets the link proceed. Once, before anything else.
    void begin(AgentThread& thread);

    [[nodiscard]] const AgentDirectory& directory() const { return directory_; }

    /// Whether there is an agent, or there may be one: one that failed a while ago has another chance at this call.
    [[nodiscard]] bool isUsable();

    /// A task's submission has been put into the spool, or a task was marked as cancelled.
    void taskChanged(std::string token);
    /// Tells the agent a task's new description.
    void describe(std::string token, std::string description);
    /// Answers once the agent has said which tasks it has.
    void list(TransferSession::Listing listing);
    /// Signals once nothing more waits for this session.
    void flush();
    /// Hangs up: the session has gone.
    void leave();

    // What the link says.
    void agentIsReady() override CORVANE_REQUIRES(agentThread);
    void agentSaid(const agent::Reply& reply) override CORVANE_REQUIRES(agentThread);
    void agentFailed(const std::string& why) override CORVANE_REQUIRES(agentThread);
    void processEnds() override CORVANE_REQUIRES(agentThread);

  private:
    template <class Work>
    void post(Work work);
    void send(agent::Request request) CORVANE_REQUIRES(agentThread);
    /// As `isUsable`, without another chance.
    [[nodiscard]] bool mayBecomeReady() const;

    /// Tells the agent of a task that is spooled or cancelled; without an agent, takes it back.
    void submitOrTakeBack(const std::string& token) CORVANE_REQUIRES(agentThread);
    /// Tells the agent of a task that is spooled and not accepted, and of the mark of one that is cancelled.
    void submit(const Task& task) CORVANE_REQUIRES(agentThread);
    /// Withdraws a task of this run from the agent and starts it inside the process; a cancelled one, of any run, is
    /// over. `why` goes into the log; nullptr when that has been said already. A task that is still on its way to the
    /// spool waits until it is there.
    void takeBack(const std::shared_ptr<Task>& task, const char* why) CORVANE_REQUIRES(agentThread);
    /// A task that was accepted and is in no list any more is lost to the agent, whatever happened to its journal; one
    /// of another process was acknowledged there.
    void checkMissing(const AgentQuestions::Known& listed) CORVANE_REQUIRES(agentThread);
    /// The task of a token; one that is not known yet is an earlier run's. Nothing when the session has gone.
    [[nodiscard]] std::shared_ptr<Task> findOrAdopt(const std::string& token,
                                                    const std::optional<std::string>& description)
        CORVANE_REQUIRES(agentThread);
    void ask() CORVANE_REQUIRES(agentThread);
    void askForFlush() CORVANE_REQUIRES(agentThread);
    void answer(const TransferSession::Listing& listing);
    void signalFlushes() CORVANE_REQUIRES(agentThread);
    /// Has the agent forget a task, now and as often as it comes up with it.
    void acknowledge(const std::string& token) CORVANE_REQUIRES(agentThread);
    /// Enqueues the report of a task that this session tells its delegate of, and then acknowledges.
    void reportCompletion(std::shared_ptr<Task> task, TransferOutcome outcome) CORVANE_REQUIRES(agentThread);
    /// The same of one that the agent has forgotten. A cancelled one has completed. Another process has told of any
    /// other: the row and the payload are that one's business, and whoever waits here is to wait no longer.
    /// `outcome` is nothing when the agent has not told of any.
    void reportForgotten(std::shared_ptr<Task> task, std::optional<TransferOutcome> outcome)
        CORVANE_REQUIRES(agentThread);
    /// Takes back what the agent has said of servers that it cannot reach: another one finds out for itself.
    void forgetTroubles() CORVANE_REQUIRES(agentThread);
    /// While an end is waited for, an agent that hangs must not go unnoticed.
    void watch() CORVANE_REQUIRES(agentThread);

    void take(const agent::Accepted& reply) CORVANE_REQUIRES(agentThread);
    void take(const agent::Refused& reply) CORVANE_REQUIRES(agentThread);
    void take(const agent::Known& reply) CORVANE_REQUIRES(agentThread);
    void take(const agent::Listed& reply) CORVANE_REQUIRES(agentThread);
    void take(const agent::Progress& reply) CORVANE_REQUIRES(agentThread);
    void take(const agent::Completed& reply) CORVANE_REQUIRES(agentThread);
    void take(const agent::Flushed& reply) CORVANE_REQUIRES(agentThread);
    void take(const agent::Forgotten& reply) CORVANE_REQUIRES(agentThread);
    void take(const agent::Elsewhere& reply) CORVANE_REQUIRES(agentThread);
    void take(const agent::Trouble& reply) CORVANE_REQUIRES(agentThread);
    // The link has used these up.
    void take(const agent::Welcome&) CORVANE_REQUIRES(agentThread) {}
    void take(const agent::Pong&) CORVANE_REQUIRES(agentThread) {}
    void take(const agent::Unsupported&) CORVANE_REQUIRES(agentThread) {}
    void take(const agent::Discarded&) CORVANE_REQUIRES(agentThread) {}

    const AgentDirectory directory_;
    const std::shared_ptr<AgentLink> link_;
    const std::chrono::milliseconds holdOff_;
    const std::weak_ptr<BackgroundTransferCore> core_;
    const std::shared_ptr<TaskTable> tasks_;
    const std::shared_ptr<SessionReporter> reporter_;
    const std::shared_ptr<InsideTransfers> inside_;

    mutable Mutex mutex_;
    bool usable_ CORVANE_GUARDED_BY(mutex_) = true;
    Clock::time_point restUntil_ CORVANE_GUARDED_BY(mutex_);

    AgentQuestions questions_ CORVANE_GUARDED_BY(agentThread);
    // The servers that the agent cannot reach, or that the way to is blocked.
    std::set<std::string> troubles_ CORVANE_GUARDED_BY(agentThread);
};

}  // namespace corvane
