#include <corvane/Agent/Host/BackgroundTransferCore.h>

#include <corvane/Agent/Host/AgentProgram.h>
#include <corvane/Agent/Host/AgentThread.h>
#include <corvane/Agent/Host/TransferDiscard.h>
#include <corvane/Agent/TransferSubmission.h>
#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/PrivateFile.h>

#include <exception>
#include <system_error>
#include <utility>

namespace corvane {

namespace {
using Stage = BackgroundTransferTask::Stage;
}  // namespace

BackgroundTransferCore::BackgroundTransferCore(TransferSessionConfiguration configuration,
                                               std::weak_ptr<TransferSessionDelegate> delegate,
                                               std::shared_ptr<SerialQueue> queue, TransferAgentOptions options)
    : configuration_(InProcessTransferSession::resolved(std::move(configuration))),
      options_(std::move(options)),
      reporter_(std::make_shared<SessionReporter>(std::move(delegate), std::move(queue))),
      tasks_(std::make_shared<TaskTable>()),
      inside_(std::make_shared<InsideTransfers>(configuration_, reporter_, tasks_)) {}

void BackgroundTransferCore::open() {
    AgentThread& thread = AgentThread::shared();
    try {
        const auto program = options_.program.empty() ? AgentProgram::find() : options_.program;
        if (program.empty()) throw InvalidArgument("the program corvane-transferd was not found");
        conversation_ = converse(program);
    } catch (const std::exception& error) {
        Log::shared().error("Transfer agent is not available, transfers go on inside the process, error=%{public}@",
                            error.what());
        return;
    }
    conversation_->begin(thread);
}

std::shared_ptr<AgentConversation> BackgroundTransferCore::converse(const std::filesystem::path& program) {
    TransferSubmission::checkNames(configuration_.identifier, configuration_.ownerKey, wakeCommand());
    const AgentDirectory directory(options_.directory.empty() ? DocumentsDirectory::create() / AgentDirectory::usualName
                                                              : options_.directory);
    TransferDiscard::noteDirectory(directory, options_.deadline);
    auto link = std::make_shared<AgentLink>(
        AgentLink::wayTo(directory, program, options_), options_.deadline,
        agent::Hello{
            .session = configuration_.identifier, .owner = configuration_.ownerKey, .wakeCommand = wakeCommand()},
        AgentLink::Clock::now());
    return std::make_shared<AgentConversation>(
        directory, std::move(link), options_.holdOff,
        AgentConversation::Session{weak_from_this(), tasks_, reporter_, inside_});
}

std::vector<std::string> BackgroundTransferCore::wakeCommand() const {
    return configuration_.relaunchesForEvents ? options_.wakeCommand : std::vector<std::string>();
}

void BackgroundTransferCore::close() {
    reporter_->close();
    inside_->close();
    tasks_->close();
    if (conversation_) conversation_->leave();
}

std::shared_ptr<BackgroundTransferTask> BackgroundTransferCore::add(TransferRequest request,
                                                                    std::filesystem::path file) {
    std::error_code failed;
    auto absolute = std::filesystem::absolute(file, failed);
    auto task = std::make_shared<Task>(weak_from_this(), tasks_->nextIdentifier(), std::move(request),
                                       failed ? std::move(file) : std::move(absolute));
    static_cast<void>(tasks_->insert(task));  // an open session's table takes every task
    return task;
}

// The task is on disk before anybody is told of it: an agent finds it there, whatever becomes of this process.
void BackgroundTransferCore::start(const std::shared_ptr<Task>& task) {
    if (!agentIsUsable() || !spool(*task)) return inside_->takeOver(task);
    task->advanceTo(Stage::spooled);
    conversation_->taskChanged(task->token());
}

// Whoever brings a task from `suspended` to `submitting` decides what becomes of it.
void BackgroundTransferCore::cancel(const std::shared_ptr<Task>& task) {
    if (task->advanceTo(Stage::submitting)) return inside_->takeOver(task);
    if (const auto inner = task->inner()) inner->cancel();
    if (conversation_) conversation_->taskChanged(task->token());
}

bool BackgroundTransferCore::spool(const Task& task) {
    try {
        const std::string bytes = submission(task);
        if (bytes.size() > TransferSubmission::longest) throw InvalidArgument("the request is too long for the agent");
        replacePrivateFile(conversation_->directory().submissionPath(task.token()), bytes);
        return true;
    } catch (const std::exception& error) {
        Log::shared().error("Transfer goes on inside the process, it cannot be submitted, error=%{public}@",
                            error.what());
        return false;
    }
}

std::string BackgroundTransferCore::submission(const Task& task) const {
    std::vector<std::pair<std::string, std::string>> extras;
    if (!reporter_->wantsProgress()) extras.emplace_back(TransferSubmission::withoutProgress);
    return TransferSubmission{.token = task.token(),
                              .session = configuration_.identifier,
                              .owner = configuration_.ownerKey,
                              .description = task.description(),
                              .request = task.request(),
                              .bodyPath = task.bodyPath().string(),
                              .limits = configuration_.limits,
                              .patience = options_.patience,
                              .wakeCommand = wakeCommand(),
                              .trustedCertificates = configuration_.trustedCertificates.string(),
                              .proxy = TransferProxy::ofEnvironment(task.request().url),
                              .extras = std::move(extras)}
        .encoded();
}

void BackgroundTransferCore::describe(std::string token, std::string text) {
    if (!conversation_) return;
    if (text.size() > TransferSubmission::longestDescription) {
        Log::shared().error("Description is too long for the transfer agent, which keeps the one before");
        return;
    }
    conversation_->describe(std::move(token), std::move(text));
}

void BackgroundTransferCore::tasks(TransferSession::Listing listing) {
    if (agentIsUsable()) return conversation_->list(std::move(listing));
    reporter_->answer(std::move(listing), [tasks = tasks_] { return tasks->listing(); });
}

void BackgroundTransferCore::deliverPendingEvents() {
    if (agentIsUsable()) return conversation_->flush();
    reporter_->signalDelivered();
}

}  // namespace corvane
