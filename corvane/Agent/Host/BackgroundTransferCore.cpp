#include <corvane/Agent/Host/BackgroundTransferCore.h>

#include <corvane/Agent/Host/AgentProgram.h>
#include <corvane/Agent/Host/AgentThread.h>
#include <corvane/Agent/TransferSubmission.h>
#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/HostCall.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/PrivateFile.h>
#include <corvane/Transfer/TransferError.h>

#include <algorithm>
#include <set>

namespace corvane {

namespace {

using Keeper = BackgroundTransferTask::Keeper;

constexpr const char* folder = "com.veskar.corvane.transfer-agent";

std::vector<std::string> wakeCommand(const TransferSessionConfiguration& configuration,
                                     const TransferAgentOptions& options) {
    return configuration.relaunchesForEvents ? options.wakeCommand : std::vector<std::string>();
}

TransferOutcome takenBack() {
    TransferOutcome made;
    made.errorCode = static_cast<std::int64_t>(TransferError::Code::network);
    made.errorText = "another process has taken the transfer over";
    return made;
}

}  // namespace

BackgroundTransferCore::BackgroundTransferCore(TransferSessionConfiguration configuration,
                                               std::weak_ptr<TransferSessionDelegate> delegate,
                                               std::shared_ptr<SerialQueue> queue, TransferAgentOptions options)
    : configuration_(InProcessTransferSession::resolved(std::move(configuration))),
      delegate_(std::move(delegate)),
      queue_(std::move(queue)),
      options_(std::move(options)) {}

void BackgroundTransferCore::open() {
    AgentThread& thread = AgentThread::shared();
    try {
        const auto program = options_.program.empty() ? AgentProgram::find() : options_.program;
        if (program.empty()) throw InvalidArgument("the program corvane-transferd was not found");
        link_ = makeLink(program);
    } catch (const std::exception& error) {
        Log::shared().error("Transfer agent is not available, transfers go on inside the process, error=%{public}@",
                            error.what());
        return;
    }
    agentUsable_ = true;
    link_->setListener(weak_from_this());
    thread.attach(link_);
}

std::shared_ptr<AgentLink> BackgroundTransferCore::makeLink(const std::filesystem::path& program) {
    TransferSubmission::checkNames(configuration_.identifier, configuration_.ownerKey,
                                   wakeCommand(configuration_, options_));
    directory_.emplace(options_.directory.empty() ? DocumentsDirectory::create() / folder : options_.directory);
    return std::make_shared<AgentLink>(*directory_, program, options_,
                                       agent::Hello{.session = configuration_.identifier,
                                                    .owner = configuration_.ownerKey,
                                                    .wakeCommand = wakeCommand(configuration_, options_)});
}

void BackgroundTransferCore::close() {
    std::shared_ptr<InProcessTransferSession> inside;  // cancelled outside the lock
    std::map<std::int64_t, std::shared_ptr<Task>> open;
    {
        std::lock_guard lock(mutex_);
        closed_ = true;
        inside.swap(inside_);
        open.swap(tasks_);
        tokens_.clear();
        takenOver_.clear();
    }
    for (const auto& [identifier, task] : open) task->setCompleted();
    if (link_) AgentThread::shared().post([self = shared_from_this()] { self->leave(); });
}

// An agent that is killed before it reads an acknowledgement finds the mark, so that the next session is not told
// again.
void BackgroundTransferCore::leave() {
    processEnds();
    link_->close();
}

void BackgroundTransferCore::processEnds() {
    for (const auto& token : reported_) {
        if (acknowledged().contains(token)) directory_->withdraw(token);
    }
}

std::optional<std::string> BackgroundTransferCore::description() const {
    std::lock_guard lock(mutex_);
    return description_;
}

void BackgroundTransferCore::setDescription(std::string description) {
    std::lock_guard lock(mutex_);
    description_ = std::move(description);
}

std::shared_ptr<BackgroundTransferTask> BackgroundTransferCore::add(TransferRequest request,
                                                                    std::filesystem::path file) {
    std::lock_guard lock(mutex_);
    const auto identifier = ++lastIdentifier_;
    std::error_code failed;
    auto absolute = std::filesystem::absolute(file, failed);
    auto task = std::make_shared<Task>(weak_from_this(), identifier, std::move(request),
                                       failed ? std::move(file) : std::move(absolute));
    tasks_.emplace(identifier, task);
    tokens_.emplace(task->token(), task);
    return task;
}

// The task is on disk before anybody is told of it: an agent finds it there, whatever becomes of this process.
void BackgroundTransferCore::start(const std::shared_ptr<Task>& task) {
    if (!agentIsUsable()) return takeOver(task);
    if (!task->moveTo(Keeper::agent)) return;
    try {
        const std::string bytes = submission(*task);
        if (bytes.size() > TransferSubmission::longest) throw InvalidArgument("the request is too long for the agent");
        replacePrivateFile(directory_->submission(task->token()), bytes);
    } catch (const std::exception& error) {
        Log::shared().error("Transfer goes on inside the process, it cannot be submitted, error=%{public}@",
                            error.what());
        return takeOver(task);
    }
    if (!task->isKeptBy(Keeper::agent)) {  // taken over while the file was written
        directory_->withdraw(task->token());
        return;
    }
    task->setSpooled();
    AgentThread::shared().post([self = shared_from_this(), token = task->token()] { self->submitted(token); });
}

std::string BackgroundTransferCore::submission(const Task& task) const {
    return TransferSubmission{.token = task.token(),
                              .session = configuration_.identifier,
                              .owner = configuration_.ownerKey,
                              .description = task.description(),
                              .request = task.request(),
                              .file = task.file().string(),
                              .limits = configuration_.limits,
                              .patience = options_.patience,
                              .wakeCommand = wakeCommand(configuration_, options_),
                              .trustedCertificates = configuration_.trustedCertificates.string(),
                              .proxy = TransferProxy::ofEnvironment(task.request().url)}
        .encoded();
}

// Also lets an agent that failed a while ago have another chance.
bool BackgroundTransferCore::agentIsUsable() {
    {
        std::lock_guard lock(mutex_);
        if (agentUsable_) return true;
        if (!link_ || closed_ || Clock::now() < restUntil_) return false;
        agentUsable_ = true;
    }
    AgentThread::shared().post([link = link_] { link->retry(Clock::now()); });
    return true;
}

bool BackgroundTransferCore::mayBecomeReady() const {
    std::lock_guard lock(mutex_);
    return agentUsable_;
}

// The agent may have failed since the task was given to it: nobody would take the task back then. One that was taken
// back while its submission was being written leaves that behind.
void BackgroundTransferCore::submitted(const std::string& token) {
    const auto task = find(token);
    if (task ? task->isKeptBy(Keeper::process) : acknowledged().contains(token)) {
        directory_->withdraw(token);
    } else if (task && mayBecomeReady()) {
        submit(*task);
    } else if (task) {
        takeBack(task, nullptr);
    }
    watch();
}

// An agent that found the submission by itself may be through with it, and have forgotten it: to ask for it then would
// look like a task that was lost.
void BackgroundTransferCore::submit(const Task& task) {
    if (!task.isKeptBy(Keeper::agent) || !task.isUnanswered() || isReported(task.token())) return;
    link_->send(agent::Submit{task.token()}, 1);
}

// A task that cannot be started inside the process either has failed: nobody else would end it.
void BackgroundTransferCore::takeOver(const std::shared_ptr<Task>& task) {
    if (!task->moveTo(Keeper::process)) return;
    try {
        startInside(task);
    } catch (...) {
        queue_->async([self = shared_from_this(), task, error = AnyError::current()] {
            self->finish(*task, &TransferSessionDelegate::taskDidComplete, error, std::nullopt);
        });
    }
}

void BackgroundTransferCore::startInside(const std::shared_ptr<Task>& task) {
    std::shared_ptr<TransferTask> inner;
    {
        std::lock_guard lock(mutex_);
        if (closed_) return;
        if (!inside_) inside_ = std::make_shared<InProcessTransferSession>(configuration_, weak_from_this(), queue_);
        inner = inside_->uploadTask(task->request(), task->file());
        takenOver_.emplace(inner->identifier(), task);
    }
    inner->resume();
}

void BackgroundTransferCore::takeBack(const std::shared_ptr<Task>& task, const char* why) {
    if (!task->isOfThisRun() || !task->isKeptBy(Keeper::agent)) return;
    if (why) {
        Log::shared().error("Transfer goes on inside the process, task=%ld, reason=%{public}@", task->identifier(),
                            why);
    }
    directory_->withdraw(task->token());
    acknowledged().insert(task->token());  // whatever the agent says of it from now on
    takeOver(task);
}

void BackgroundTransferCore::describe(std::string token, std::string description) {
    if (description.size() > TransferSubmission::longestDescription) {
        Log::shared().error("Description is too long for the transfer agent, which keeps the one before");
        return;
    }
    AgentThread::shared().post(
        [self = shared_from_this(), token = std::move(token), description = std::move(description)] {
            self->link_->send(agent::Describe{token, description}, 0);
        });
}

void BackgroundTransferCore::tasks(TransferSession::Listing listing) {
    if (!agentIsUsable()) return answer(std::move(listing));
    AgentThread::shared().post([self = shared_from_this(), listing = std::move(listing)] {
        self->listings_.emplace_back(self->asked_ + 1, listing);
        self->ask();
    });
}

void BackgroundTransferCore::deliverPendingEvents() {
    if (!agentIsUsable()) return signal();
    AgentThread::shared().post([self = shared_from_this()] {
        ++self->flushes_;
        self->flush();
    });
}

void BackgroundTransferCore::ask() {
    if (link_->isReady()) {
        ++asked_;
        link_->send(agent::List{}, 1);
        return;
    }
    if (mayBecomeReady()) return;  // asked then
    for (auto& [question, listing] : listings_) answer(std::move(listing));
    listings_.clear();
}

// The answer goes through the queue, behind the completions that wait there.
void BackgroundTransferCore::answer(TransferSession::Listing listing) {
    queue_->async([self = shared_from_this(), listing = std::move(listing)] {
        const Tasks open = self->openTasks();
        listing({open.begin(), open.end()});
    });
}

void BackgroundTransferCore::flush() {
    if (!mayBecomeReady()) {
        for (; flushes_ > 0; --flushes_) signal();
    } else {
        link_->send(agent::Flush{}, 0);
        watch();
    }
}

void BackgroundTransferCore::signal() {
    queue_->async([self = shared_from_this()] {
        if (const auto told = self->listener()) told->allEventsDelivered();
    });
}

void BackgroundTransferCore::agentIsReady() {
    for (const auto& task : openTasks()) submit(*task);
    answered_ = asked_;  // what was asked of the lost one is not answered any more
    for (auto& [question, listing] : listings_) question = asked_ + 1;
    ask();
    if (flushes_ > 0) flush();
    watch();
}

void BackgroundTransferCore::agentAccepted(const std::string& token) {
    if (const auto task = find(token)) task->setAccepted();
}

void BackgroundTransferCore::agentRefused(const std::string& token, const std::string& reason) {
    const auto task = find(token);
    if (task && !isReported(token)) takeBack(task, reason.c_str());
    watch();
}

void BackgroundTransferCore::agentListed(std::vector<AgentLink::Task> tasks) {
    ++answered_;
    missed(tasks);
    listed(tasks);
    for (auto& [question, listing] : listings_) {
        if (question <= answered_) answer(std::move(listing));
    }
    std::erase_if(listings_, [this](const auto& one) { return one.first <= answered_; });
    watch();
}

// A task that was accepted and is in no list any more is lost to the agent, whatever happened to its journal; one of
// another process was acknowledged there.
void BackgroundTransferCore::missed(const std::vector<AgentLink::Task>& listed) {
    std::set<std::string_view> known;
    for (const auto& task : listed) known.insert(task.token);
    for (const auto& task : openTasks()) {
        const bool isMissing = task->isKeptBy(Keeper::agent) && task->isAccepted() && !known.contains(task->token()) &&
                               !isReported(task->token());
        if (isMissing && task->isOfThisRun()) takeBack(task, "the agent has lost it");
        if (isMissing && !task->isOfThisRun()) endElsewhere(task, takenBack());
    }
}

bool BackgroundTransferCore::isReported(const std::string& token) {
    return reported_.contains(token) || acknowledged().contains(token);
}

void BackgroundTransferCore::listed(const std::vector<AgentLink::Task>& listed) {
    for (const auto& task : listed) {
        if (!isReported(task.token) && !find(task.token)) static_cast<void>(adopt(task));
    }
}

void BackgroundTransferCore::agentProgressed(const std::string& token, std::int64_t total, std::int64_t expected) {
    auto task = find(token);
    if (!task || !task->isKeptBy(Keeper::agent) || !task->note(total, expected)) return;
    queue_->async([self = shared_from_this(), task = std::move(task)] {
        const auto progress = task->takeProgress();
        const auto told = self->listener();
        if (told && progress.step > 0) {
            told->taskDidSendBodyData(*task, progress.step, progress.total, progress.expected);
        }
    });
}

void BackgroundTransferCore::agentCompleted(const AgentLink::Task& completed, const TransferOutcome& outcome) {
    if (acknowledged().contains(completed.token)) {  // the agent was killed before it forgot, or it was taken back
        link_->send(agent::Acknowledge{completed.token}, 1);
        return;
    }
    if (reported_.contains(completed.token)) return;  // the report waits in the queue
    auto task = find(completed.token);
    if (!task) task = adopt(completed);
    if (!task || task->isKeptBy(Keeper::process)) {  // reported by the process
        reported_.insert(completed.token);
        return acknowledge(completed.token);
    }
    enqueueReport(completed.token, [self = shared_from_this(), task = std::move(task), outcome] {
        // One that nobody was told of stays for the next session.
        if (!self->finish(*task, &TransferSessionDelegate::taskDidComplete, outcome.error(), outcome.response)) return;
        AgentThread::shared().post([self, token = task->token()] { self->acknowledge(token); });
    });
}

// The row and the payload are the business of the process that reported it; whoever waits here is to wait no longer.
void BackgroundTransferCore::agentEndedElsewhere(const AgentLink::Task& ended,
                                                 const std::optional<TransferOutcome>& outcome) {
    if (reported_.contains(ended.token)) return;
    auto task = find(ended.token);
    if (!task && !acknowledged().contains(ended.token)) task = adopt(ended);
    if (task && task->isKeptBy(Keeper::agent)) endElsewhere(std::move(task), outcome.value_or(takenBack()));
}

// Without memory for the report it is as if the agent had said nothing; it does so again on the next connection.
void BackgroundTransferCore::enqueueReport(const std::string& token, std::function<void()> report) {
    const auto noted = reported_.insert(token).first;
    try {
        queue_->async(std::move(report));
    } catch (...) {
        reported_.erase(noted);
        throw;
    }
}

// Reported from now on: the agent may refuse a submission that it has had, been told of and forgotten.
void BackgroundTransferCore::endElsewhere(std::shared_ptr<Task> task, const TransferOutcome& outcome) {
    if (reported_.contains(task->token())) return;
    const std::string name = task->token();
    enqueueReport(name, [self = shared_from_this(), task = std::move(task), outcome] {
        self->finish(*task, &TransferSessionDelegate::taskDidEndElsewhere, outcome.error(), outcome.response);
        AgentThread::shared().post([self, token = task->token()] {
            self->reported_.erase(token);
            self->watch();
        });
    });
}

void BackgroundTransferCore::acknowledge(const std::string& token) {
    acknowledged().insert(token);
    link_->send(agent::Acknowledge{token}, 1);
    watch();
}

void BackgroundTransferCore::agentForgot(const std::string& token) {
    reported_.erase(token);
    acknowledged().erase(token);
}

std::set<std::string>& BackgroundTransferCore::acknowledged() {
    return AgentThread::shared().acknowledged();
}

void BackgroundTransferCore::agentFlushed() {
    for (; flushes_ > 0; --flushes_) signal();
    watch();
}

void BackgroundTransferCore::agentFailed() {
    {
        std::lock_guard lock(mutex_);
        agentUsable_ = false;
        restUntil_ = Clock::now() + options_.holdOff;
    }
    for (const auto& task : openTasks()) {  // one that there is no memory for stays the agent's
        if (!isReported(task->token())) callHost("transfer agent link", [&] { takeBack(task, nullptr); });
    }
    for (auto& [question, listing] : listings_) answer(std::move(listing));
    listings_.clear();
    for (; flushes_ > 0; --flushes_) signal();
}

// While an end is waited for, an agent that hangs must not go unnoticed.
void BackgroundTransferCore::watch() {
    bool awaits = flushes_ > 0;
    {
        std::lock_guard lock(mutex_);
        awaits = awaits || std::any_of(tasks_.begin(), tasks_.end(),
                                       [](const auto& task) { return task.second->isKeptBy(Keeper::agent); });
    }
    link_->setAwaitsTasks(awaits);
}

void BackgroundTransferCore::taskDidSendBodyData(const TransferTask& inner, std::int64_t sent, std::int64_t total,
                                                 std::int64_t expected) {
    const auto task = tookOver(inner);
    const auto told = listener();
    if (task && told) told->taskDidSendBodyData(*task, sent, total, expected);
}

void BackgroundTransferCore::taskDidComplete(const TransferTask& inner, const std::optional<AnyError>& error,
                                             const std::optional<TransferResponse>& response) {
    const auto task = tookOver(inner);
    if (!task) return;
    finish(*task, &TransferSessionDelegate::taskDidComplete, error, response);
    std::lock_guard lock(mutex_);
    takenOver_.erase(inner.identifier());
}

// On the queue. Returns whether the delegate was told.
bool BackgroundTransferCore::finish(Task& task, Ending ending, const std::optional<AnyError>& error,
                                    const std::optional<TransferResponse>& response) {
    const auto told = listener();
    if (!told) return false;
    struct Completed {  // however the delegate comes back
        ~Completed() {
            task.setCompleted();
            core.remove(task);
        }
        Task& task;
        BackgroundTransferCore& core;
    } completed{task, *this};
    callHost("transfer session delegate", [&] { (*told.*ending)(task, error, response); });
    return true;
}

BackgroundTransferCore::Tasks BackgroundTransferCore::openTasks() const {
    std::lock_guard lock(mutex_);
    Tasks open;
    open.reserve(tasks_.size());
    for (const auto& [identifier, task] : tasks_) open.push_back(task);
    return open;
}

std::shared_ptr<BackgroundTransferTask> BackgroundTransferCore::find(const std::string& token) const {
    std::lock_guard lock(mutex_);
    const auto found = tokens_.find(token);
    return found == tokens_.end() ? nullptr : found->second;
}

std::shared_ptr<BackgroundTransferTask> BackgroundTransferCore::adopt(const AgentLink::Task& task) {
    std::lock_guard lock(mutex_);
    if (closed_) return nullptr;
    const auto identifier = ++lastIdentifier_;
    auto adopted = std::make_shared<Task>(weak_from_this(), identifier, task.token, task.description);
    tasks_.emplace(identifier, adopted);
    tokens_.emplace(task.token, adopted);
    return adopted;
}

std::shared_ptr<BackgroundTransferTask> BackgroundTransferCore::tookOver(const TransferTask& inner) const {
    std::lock_guard lock(mutex_);
    const auto found = takenOver_.find(inner.identifier());
    return found == takenOver_.end() ? nullptr : found->second;
}

std::shared_ptr<TransferSessionDelegate> BackgroundTransferCore::listener() const {
    {
        std::lock_guard lock(mutex_);
        if (closed_) return nullptr;
    }
    return delegate_.lock();
}

void BackgroundTransferCore::remove(const Task& task) {
    std::shared_ptr<Task> removed;  // let go of outside the lock
    std::lock_guard lock(mutex_);
    if (const auto found = tasks_.find(task.identifier()); found != tasks_.end()) {
        removed = std::move(found->second);
        tokens_.erase(removed->token());
        tasks_.erase(found);
    }
}

}  // namespace corvane
