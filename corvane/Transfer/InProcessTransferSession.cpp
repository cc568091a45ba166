#include <corvane/Transfer/InProcessTransferSession.h>

#include <corvane/Platform/Mutex.h>
#include <corvane/Transfer/SessionReporter.h>
#include <corvane/Transfer/SessionTask.h>
#include <corvane/Transfer/TransferThread.h>

#include <cstdint>
#include <map>
#include <utility>
#include <vector>

namespace corvane {

// What the session and its pending callbacks share. The tasks that are not completed are held here, so that a listing
// has them and a task that nobody else holds goes on. Nothing is ever called with the mutex held.
class InProcessTransferSession::Core final : public std::enable_shared_from_this<Core> {
  public:
    Core(TransferSessionConfiguration opened, std::weak_ptr<TransferSessionDelegate> delegate,
         std::shared_ptr<SerialQueue> queue)
        : configuration(std::move(opened)),
          reporter(std::make_shared<SessionReporter>(std::move(delegate), std::move(queue))) {}

    std::shared_ptr<UploadTask> add(TransferRequest request, std::filesystem::path path);
    void remove(std::int64_t identifier);
    void close();
    std::vector<std::shared_ptr<TransferTask>> list() const;

    const TransferSessionConfiguration configuration;
    const std::shared_ptr<SessionReporter> reporter;
    Description description;

  private:
    mutable Mutex mutex_;
    std::map<std::int64_t, std::shared_ptr<UploadTask>> tasks_ CORVANE_GUARDED_BY(mutex_);
    std::int64_t lastIdentifier_ CORVANE_GUARDED_BY(mutex_) = 0;
};

class InProcessTransferSession::UploadTask final : public SessionTask, public std::enable_shared_from_this<UploadTask> {
  public:
    UploadTask(std::weak_ptr<Core> core, std::int64_t identifier, TransferRequest request, std::filesystem::path path)
        : SessionTask(identifier), core_(std::move(core)), request_(std::move(request)), path_(std::move(path)) {}

    State state() const override {
        Lock lock(mutex_);
        return state_;
    }
    void resume() override;
    void cancel() override;
    void complete() override;
    /// Ends the task with its session. Returns the ticket of a transfer that is to be dropped, or 0.
    TransferThread::Ticket close();

  private:
    HTTPTransfer transfer(const Core& core) CORVANE_REQUIRES(mutex_);
    static void reportEnd(std::shared_ptr<UploadTask> task, std::shared_ptr<Core> core, TransferOutcome outcome);

    const std::weak_ptr<Core> core_;

    mutable Mutex mutex_;
    TransferRequest request_ CORVANE_GUARDED_BY(mutex_);  // until the transfer starts
    std::filesystem::path path_ CORVANE_GUARDED_BY(mutex_);
    State state_ CORVANE_GUARDED_BY(mutex_) = State::suspended;
    TransferThread::Ticket ticket_ CORVANE_GUARDED_BY(mutex_) = 0;
};

void InProcessTransferSession::UploadTask::resume() {
    const auto core = core_.lock();
    if (!core) return;
    Lock lock(mutex_);
    if (state_ != State::suspended) return;
    state_ = State::running;
    ticket_ = TransferThread::start(transfer(*core));
}

void InProcessTransferSession::UploadTask::cancel() {
    auto core = core_.lock();
    if (!core) return;
    Lock lock(mutex_);
    if (state_ != State::suspended && state_ != State::running) return;
    const bool isStarted = std::exchange(state_, State::cancelling) == State::running;
    if (!isStarted) reportEnd(shared_from_this(), std::move(core), cancelledOutcome());
    if (ticket_ != 0) TransferThread::cancel({ticket_});
}

void InProcessTransferSession::UploadTask::complete() {
    close();
    if (const auto core = core_.lock()) core->remove(identifier());
}

TransferThread::Ticket InProcessTransferSession::UploadTask::close() {
    Lock lock(mutex_);
    return std::exchange(state_, State::completed) == State::completed ? 0 : ticket_;
}

HTTPTransfer InProcessTransferSession::UploadTask::transfer(const Core& core) {
    HTTPTransfer transfer;
    transfer.request = std::move(request_);
    transfer.bodyPath = std::move(path_);
    transfer.limits = core.configuration.limits;
    transfer.proxy = TransferProxy::ofEnvironment(transfer.request.url);
    transfer.trustedCertificates = core.configuration.trustedCertificates;
    transfer.pool = "upload";
    transfer.didSend = [self = weak_from_this(), weakCore = core_](std::int64_t total, std::int64_t expected) {
        auto task = self.lock();
        const auto owner = weakCore.lock();
        if (task && owner) owner->reporter->reportProgress(std::move(task), total, expected);
    };
    transfer.didComplete = [self = weak_from_this(), weakCore = core_](TransferOutcome outcome) {
        auto task = self.lock();
        auto owner = weakCore.lock();
        if (task && owner) reportEnd(std::move(task), std::move(owner), std::move(outcome));
    };
    return transfer;
}

void InProcessTransferSession::UploadTask::reportEnd(std::shared_ptr<UploadTask> task, std::shared_ptr<Core> core,
                                                     TransferOutcome outcome) {
    const auto reporter = core->reporter;  // the session may be gone before the call is back
    // Nobody else would ever end a task whose delegate has gone.
    auto afterwards = [task, core = std::move(core)](bool isTold) {
        if (!isTold) task->complete();
    };
    reporter->enqueueEnd(std::move(task), &TransferSessionDelegate::taskDidComplete, std::move(outcome),
                         std::move(afterwards));
}

std::shared_ptr<InProcessTransferSession::UploadTask> InProcessTransferSession::Core::add(TransferRequest request,
                                                                                          std::filesystem::path path) {
    Lock lock(mutex_);
    const auto identifier = ++lastIdentifier_;
    auto task = std::make_shared<UploadTask>(weak_from_this(), identifier, std::move(request), std::move(path));
    tasks_.emplace(identifier, task);
    return task;
}

void InProcessTransferSession::Core::remove(std::int64_t identifier) {
    std::shared_ptr<UploadTask> removed;  // let go of outside the lock
    Lock lock(mutex_);
    if (const auto found = tasks_.find(identifier); found != tasks_.end()) {
        removed = std::move(found->second);
        tasks_.erase(found);
    }
}

void InProcessTransferSession::Core::close() {
    reporter->close();
    std::map<std::int64_t, std::shared_ptr<UploadTask>> open;
    {
        Lock lock(mutex_);
        open.swap(tasks_);
    }
    std::vector<TransferThread::Ticket> running;
    for (const auto& [identifier, task] : open) {
        if (const auto ticket = task->close()) running.push_back(ticket);
    }
    TransferThread::cancel(running);
}

std::vector<std::shared_ptr<TransferTask>> InProcessTransferSession::Core::list() const {
    Lock lock(mutex_);
    std::vector<std::shared_ptr<TransferTask>> listed;
    listed.reserve(tasks_.size());
    for (const auto& [identifier, task] : tasks_) listed.push_back(task);
    return listed;
}

TransferSession::Factory InProcessTransferSession::factory() {
    return [](const TransferSessionConfiguration& configuration, std::weak_ptr<TransferSessionDelegate> delegate,
              std::shared_ptr<SerialQueue> queue) {
        return std::make_shared<InProcessTransferSession>(configuration, std::move(delegate), std::move(queue));
    };
}

TransferSessionConfiguration InProcessTransferSession::resolved(TransferSessionConfiguration configuration) {
    std::error_code failed;
    auto absolute = std::filesystem::absolute(configuration.trustedCertificates, failed);
    if (!configuration.trustedCertificates.empty() && !failed) configuration.trustedCertificates = std::move(absolute);
    return configuration;
}

InProcessTransferSession::InProcessTransferSession(const TransferSessionConfiguration& configuration,
                                                   std::weak_ptr<TransferSessionDelegate> delegate,
                                                   std::shared_ptr<SerialQueue> queue)
    : core_(std::make_shared<Core>(resolved(configuration), std::move(delegate), std::move(queue))) {}

InProcessTransferSession::~InProcessTransferSession() {
    core_->close();
}

std::optional<std::string> InProcessTransferSession::description() const {
    return core_->description.get();
}

void InProcessTransferSession::setDescription(std::string description) {
    core_->description.set(std::move(description));
}

std::shared_ptr<TransferTask> InProcessTransferSession::uploadTask(TransferRequest request,
                                                                   std::filesystem::path file) {
    return core_->add(std::move(request), std::move(file));
}

void InProcessTransferSession::tasks(Listing listing) {
    core_->reporter->answer(std::move(listing), [core = core_] { return core->list(); });
}

void InProcessTransferSession::deliverPendingEvents() {
    core_->reporter->signalDelivered();
}

}  // namespace corvane
