#include <corvane/Agent/Host/AgentConversation.h>

#include <corvane/Agent/FormatError.h>
#include <corvane/Agent/Host/Acknowledgements.h>
#include <corvane/Agent/OutcomeCodec.h>
#include <corvane/Platform/HostCall.h>
#include <corvane/Platform/Log.h>
#include <corvane/Transfer/TransferError.h>

#include <set>
#include <string_view>
#include <utility>
#include <variant>

namespace corvane {

namespace {

using Stage = BackgroundTransferTask::Stage;

// One that cannot be read is a failed transfer, and no reason to leave the agent.
TransferOutcome readable(const std::string& bytes) {
    try {
        return decodeOutcome(bytes);
    } catch (const FormatError&) {
        return unreadableOutcome();
    }
}

TransferOutcome takenOverElsewhere() {
    return {AnyError(TransferError(TransferError::Code::network, "another process has taken the transfer over")),
            std::nullopt};
}

}  // namespace

AgentConversation::AgentConversation(AgentDirectory directory, std::shared_ptr<AgentLink> link,
                                     std::chrono::milliseconds holdOff, Session session)
    : directory_(std::move(directory)),
      link_(std::move(link)),
      holdOff_(holdOff),
      core_(std::move(session.core)),
      tasks_(std::move(session.tasks)),
      reporter_(std::move(session.reporter)),
      inside_(std::move(session.inside)) {}

void AgentConversation::begin(AgentThread& thread) {
    link_->setListener(weak_from_this());
    thread.attach(link_);
}

template <class Work>
void AgentConversation::post(Work work) {
    AgentThread::shared().post([self = shared_from_this(), work = std::move(work)] {
        agentThread.assertCurrent("AgentConversation");
        work(*self);
    });
}

void AgentConversation::send(agent::Request request) {
    link_->send(std::move(request), Clock::now());
}

bool AgentConversation::mayBecomeReady() const {
    Lock lock(mutex_);
    return usable_;
}

bool AgentConversation::isUsable() {
    {
        Lock lock(mutex_);
        if (usable_) return true;
        if (reporter_->isClosed() || Clock::now() < restUntil_) return false;
        usable_ = true;
    }
    post([](AgentConversation& self) CORVANE_REQUIRES(agentThread) { self.link_->retry(Clock::now()); });
    return true;
}

// --- What the session asks. ------------------------------------------------------------------------------------------

void AgentConversation::taskChanged(std::string token) {
    post([token = std::move(token)](AgentConversation& self) CORVANE_REQUIRES(agentThread) {
        self.submitOrTakeBack(token);
        self.watch();
    });
}

void AgentConversation::describe(std::string token, std::string description) {
    post([token = std::move(token), description = std::move(description)](AgentConversation& self)
             CORVANE_REQUIRES(agentThread) {
                 self.send(agent::Describe{token, description});
             });
}

void AgentConversation::list(TransferSession::Listing listing) {
    post([listing = std::move(listing)](AgentConversation& self) CORVANE_REQUIRES(agentThread) {
        self.questions_.add(listing);
        self.ask();
    });
}

void AgentConversation::flush() {
    post([](AgentConversation& self) CORVANE_REQUIRES(agentThread) {
        self.questions_.addFlush();
        self.askForFlush();
    });
}

// An agent that is killed before it reads an acknowledgement finds the mark, so that the next session is not told
// again.
void AgentConversation::leave() {
    post([](AgentConversation& self) CORVANE_REQUIRES(agentThread) {
        self.processEnds();
        self.link_->close();
    });
}

void AgentConversation::processEnds() {
    for (const auto& token : tasks_->completedTokens()) directory_.withdraw(token);
}

// --- Between the spool and the journal. ------------------------------------------------------------------------------

// The agent may have failed since the task was given to it: nobody would take the task back then.
void AgentConversation::submitOrTakeBack(const std::string& token) {
    const auto task = tasks_->find(token);
    if (!task || !task->isWithAgent() || task->stage() == Stage::submitting) return;
    if (!mayBecomeReady()) return takeBack(task, nullptr);
    if (task->isCancelled()) directory_.withdraw(token);
    submit(*task);
}

// An agent that found the submission by itself may be through with it, and have forgotten it: to ask for it then would
// look like a task that was lost.
void AgentConversation::submit(const Task& task) {
    if (task.stage() == Stage::spooled) send(agent::Submit{task.token()});
    if (task.isCancelled()) send(agent::Look{});
}

void AgentConversation::takeBack(const std::shared_ptr<Task>& task, const char* why) {
    const bool isCancelled = task->isCancelled();
    if (!task->isWithAgent() || task->stage() == Stage::submitting || !(task->isOfThisRun() || isCancelled)) return;
    directory_.withdraw(task->token());
    Acknowledgements::shared().add(task->token());  // whatever the agent says of it from now on
    if (isCancelled) return reportForgotten(task, std::nullopt);
    if (why) {
        Log::shared().error("Transfer goes on inside the process, task=%ld, reason=%{public}@", task->identifier(),
                            why);
    }
    inside_->takeOver(task);
}

void AgentConversation::take(const agent::Accepted& reply) {
    if (const auto task = tasks_->find(reply.token)) task->advanceTo(Stage::accepted);
}

void AgentConversation::take(const agent::Refused& reply) {
    if (const auto task = tasks_->find(reply.token)) takeBack(task, reply.reason.c_str());
    watch();
}

// --- Listings and flushes. -------------------------------------------------------------------------------------------

void AgentConversation::ask() {
    if (link_->isReady()) {
        questions_.asked();
        send(agent::List{});
    } else if (!mayBecomeReady()) {  // otherwise it is asked then
        for (const auto& listing : questions_.takeAll()) answer(listing);
    }
}

void AgentConversation::answer(const TransferSession::Listing& listing) {
    reporter_->answer(listing, [tasks = tasks_] { return tasks->listing(); });
}

void AgentConversation::take(const agent::Known& reply) {
    questions_.take(reply);
}

void AgentConversation::take(const agent::Listed&) {
    const auto listed = questions_.answered();
    checkMissing(listed);
    for (const auto& task : listed) {
        if (!Acknowledgements::shared().contains(task.token)) {
            static_cast<void>(findOrAdopt(task.token, task.description));
        }
    }
    for (const auto& listing : questions_.takeAnswered()) answer(listing);
    watch();
}

void AgentConversation::checkMissing(const AgentQuestions::Known& listed) {
    std::set<std::string_view> known;
    for (const auto& task : listed) known.insert(task.token);
    for (const auto& task : tasks_->open()) {
        const bool isMissing = task->stage() == Stage::accepted && !known.contains(task->token()) &&
                               !Acknowledgements::shared().contains(task->token());
        if (isMissing && task->isOfThisRun()) takeBack(task, "the agent has lost it");
        if (isMissing && !task->isOfThisRun()) reportForgotten(task, std::nullopt);
    }
}

std::shared_ptr<BackgroundTransferTask> AgentConversation::findOrAdopt(const std::string& token,
                                                                       const std::optional<std::string>& description) {
    if (auto known = tasks_->find(token)) return known;
    auto adopted = std::make_shared<Task>(core_, tasks_->nextIdentifier(), token, description);
    return tasks_->insert(adopted) ? adopted : nullptr;
}

void AgentConversation::askForFlush() {
    if (!mayBecomeReady()) return signalFlushes();
    send(agent::Flush{});
    watch();
}

void AgentConversation::signalFlushes() {
    for (int count = questions_.takeFlushes(); count > 0; --count) reporter_->signalDelivered();
}

void AgentConversation::take(const agent::Flushed&) {
    signalFlushes();
    watch();
}

// --- Progress and the end. -------------------------------------------------------------------------------------------

void AgentConversation::take(const agent::Progress& reply) {
    auto task = tasks_->find(reply.token);
    if (task && task->isWithAgent()) reporter_->reportProgress(std::move(task), reply.total, reply.expected);
}

void AgentConversation::take(const agent::Completed& reply) {
    if (Acknowledgements::shared().contains(reply.token)) {  // it was killed before it forgot, or the task taken back
        send(agent::Acknowledge{reply.token});
        return;
    }
    auto task = findOrAdopt(reply.token, reply.description);
    if (!task || task->stage() >= Stage::reporting) return;               // for the next session; waits in the queue
    if (task->stage() == Stage::inside) return acknowledge(reply.token);  // reported by the process
    reportCompletion(std::move(task), readable(reply.outcome));
}

// Without memory for the report it is as if the agent had said nothing; it does so again on the next connection. One
// that nobody was told of stays for the next session.
void AgentConversation::reportCompletion(std::shared_ptr<Task> task, TransferOutcome outcome) {
    auto afterwards = [self = shared_from_this(), token = task->token()](bool isTold) {
        if (!isTold) return;
        self->post([token](AgentConversation& on) CORVANE_REQUIRES(agentThread) { on.acknowledge(token); });
    };
    reporter_->enqueueEnd(task, &TransferSessionDelegate::taskDidComplete, std::move(outcome), std::move(afterwards));
    task->advanceTo(Stage::reporting);
}

void AgentConversation::acknowledge(const std::string& token) {
    Acknowledgements::shared().add(token);
    send(agent::Acknowledge{token});
    watch();
}

void AgentConversation::take(const agent::Forgotten& reply) {
    Acknowledgements::shared().remove(reply.token);
    const auto task = tasks_->find(reply.token);
    if (task && task->stage() == Stage::completed) tasks_->remove(reply.token);
}

void AgentConversation::take(const agent::Elsewhere& reply) {
    auto task = tasks_->find(reply.token);
    if (!task && !Acknowledgements::shared().contains(reply.token)) task = findOrAdopt(reply.token, reply.description);
    if (!task || !task->isWithAgent()) return;
    reportForgotten(std::move(task), reply.outcome.empty() ? std::nullopt : std::optional(readable(reply.outcome)));
}

void AgentConversation::reportForgotten(std::shared_ptr<Task> task, std::optional<TransferOutcome> outcome) {
    const bool isCancelled = task->isCancelled();
    if (!outcome) outcome = isCancelled ? cancelledOutcome() : takenOverElsewhere();
    auto afterwards = [self = shared_from_this(), token = task->token()](bool) {
        self->post([token](AgentConversation& on) CORVANE_REQUIRES(agentThread) {
            on.tasks_->remove(token);
            on.watch();
        });
    };
    const auto ending =
        isCancelled ? &TransferSessionDelegate::taskDidComplete : &TransferSessionDelegate::taskDidEndElsewhere;
    reporter_->enqueueEnd(task, ending, *std::move(outcome), std::move(afterwards));
    task->advanceTo(Stage::reporting);
}

void AgentConversation::take(const agent::Trouble& reply) {
    if (reply.lasts) {
        Log::shared().error("Uploads wait for their server and are tried again, server=%{public}@, reason=%{public}@",
                            reply.server, reply.reason);
    } else {
        Log::shared().default_("Uploads to a server go on, server=%{public}@", reply.server);
    }
    const bool isNews = reply.lasts ? troubles_.insert(reply.server).second : troubles_.erase(reply.server) > 0;
    if (isNews) reporter_->reportHoldUp(reply.server, reply.lasts);
}

void AgentConversation::forgetTroubles() {
    for (const auto& server : troubles_) reporter_->reportHoldUp(server, false);
    troubles_.clear();
}

// --- The agent itself. -----------------------------------------------------------------------------------------------

void AgentConversation::agentIsReady() {
    forgetTroubles();
    for (const auto& task : tasks_->open()) submit(*task);
    questions_.askAgain();
    ask();
    if (questions_.hasFlushes()) askForFlush();
    watch();
}

void AgentConversation::agentSaid(const agent::Reply& reply) {
    std::visit(
        [this](const auto& one) {
            agentThread.assertCurrent("AgentConversation::agentSaid");
            take(one);
        },
        reply);
}

void AgentConversation::agentFailed(const std::string&) {
    {
        Lock lock(mutex_);
        usable_ = false;
        restUntil_ = Clock::now() + holdOff_;
    }
    forgetTroubles();
    for (const auto& task : tasks_->open()) {  // one that there is no memory for stays the agent's
        callHost("transfer agent link", [&] {
            agentThread.assertCurrent("AgentConversation::takeBack");
            takeBack(task, nullptr);
        });
    }
    for (const auto& listing : questions_.takeAll()) answer(listing);
    signalFlushes();
}

void AgentConversation::watch() {
    link_->setAwaitsTasks(questions_.hasFlushes() || tasks_->isAgentAwaited());
}

}  // namespace corvane
