#include <corvane/Transfer/InProcessTransferSession.h>

#include <corvane/Transfer/TransferThread.h>

#include <cstdint>
#include <map>
#include <mutex>
#include <utility>
#include <vector>

namespace corvane {

// What the session and its pending callbacks share. The tasks that are not completed are held here, so that a listing
// has them and a task that nobody else holds goes on. Nothing is ever called with the mutex held.
class InProcessTransferSession::Core final : public std::enable_shared_from_this<Core> {
  public:
    Core(TransferSessionConfiguration opened, std::weak_ptr<TransferSessionDelegate> delegate,
         std::shared_ptr<SerialQueue> callbackQueue)
        : configuration(std::move(opened)), queue(std::move(callbackQueue)), delegate_(std::move(delegate)) {}

    std::shared_ptr<UploadTask> add(TransferRequest request, std::filesystem::path file);
    void remove(std::int64_t identifier);
    void close();
    std::vector<std::shared_ptr<TransferTask>> list() const;
    // The delegate, unless it or the session has gone.
    std::shared_ptr<TransferSessionDelegate> listener() const;

    std::optional<std::string> description() const {
        std::lock_guard lock(mutex_);
        return description_;
    }
    void setDescription(std::string description) {
        std::lock_guard lock(mutex_);
        description_ = std::move(description);
    }

    const TransferSessionConfiguration configuration;
    const std::shared_ptr<SerialQueue> queue;

  private:
    const std::weak_ptr<TransferSessionDelegate> delegate_;

    mutable std::mutex mutex_;
    std::optional<std::string> description_;
    std::map<std::int64_t, std::shared_ptr<UploadTask>> tasks_;
    std::int64_t lastIdentifier_ = 0;
    bool closed_ = false;
};

class InProcessTransferSession::UploadTask final : public TransferTask,
                                                   public std::enable_shared_from_this<UploadTask> {
  public:
    UploadTask(std::weak_ptr<Core> core, std::int64_t identifier, TransferRequest request, std::filesystem::path file)
        : core_(std::move(core)), identifier_(identifier), request_(std::move(request)), file_(std::move(file)) {}

    std::int64_t identifier() const override { return identifier_; }
    std::optional<std::string> description() const override {
        std::lock_guard lock(mutex_);
        return description_;
    }
    void setDescription(std::string description) override {
        std::lock_guard lock(mutex_);
        description_ = std::move(description);
    }
    State state() const override {
        std::lock_guard lock(mutex_);
        return state_;
    }
    void resume() override;
    TransferThread::Ticket close();

  private:
    HTTPTransfer transfer(const std::shared_ptr<Core>& core);
    void progressed(const std::shared_ptr<Core>& core, std::int64_t total, std::int64_t expected);
    void reportProgress(const Core& core, std::int64_t expected);
    void complete(Core& core, const std::optional<AnyError>& error, const std::optional<TransferResponse>& response);

    const std::weak_ptr<Core> core_;
    const std::int64_t identifier_;

    mutable std::mutex mutex_;
    TransferRequest request_;  // until the transfer starts
    std::filesystem::path file_;
    std::optional<std::string> description_;
    State state_ = State::suspended;
    TransferThread::Ticket ticket_ = 0;
    std::int64_t sent_ = 0;
    std::int64_t reported_ = 0;
    bool reportPending_ = false;
};

void InProcessTransferSession::UploadTask::resume() {
    const auto core = core_.lock();
    if (!core) return;
    std::lock_guard lock(mutex_);
    if (state_ != State::suspended) return;
    state_ = State::running;
    ticket_ = TransferThread::start(transfer(core));
}

// Returns the ticket of a transfer that is to be dropped, or 0.
TransferThread::Ticket InProcessTransferSession::UploadTask::close() {
    std::lock_guard lock(mutex_);
    return std::exchange(state_, State::completed) == State::running ? ticket_ : 0;
}

HTTPTransfer InProcessTransferSession::UploadTask::transfer(const std::shared_ptr<Core>& core) {
    HTTPTransfer transfer;
    transfer.request = std::move(request_);
    transfer.bodyFile = std::move(file_);
    transfer.limits = core->configuration.limits;
    transfer.proxy = TransferProxy::ofEnvironment(transfer.request.url);
    transfer.trustedCertificates = core->configuration.trustedCertificates;
    transfer.pool = "upload";
    transfer.didSend = [self = weak_from_this(), weakCore = core_](std::int64_t total, std::int64_t expected) {
        const auto task = self.lock();
        const auto owner = weakCore.lock();
        if (task && owner) task->progressed(owner, total, expected);
    };
    transfer.didComplete = [self = weak_from_this(), weakCore = core_](std::optional<AnyError> error,
                                                                       std::optional<TransferResponse> response) {
        auto task = self.lock();
        auto owner = weakCore.lock();
        if (!task || !owner) return;
        auto& queue = *owner->queue;
        queue.async([task = std::move(task), owner, error = std::move(error), response = std::move(response)] {
            task->complete(*owner, error, response);
        });
    };
    return transfer;
}

// On the transfer thread. While a report waits in the queue, later progress is added to it, so that a large body and a
// busy queue do not make a heap of reports.
void InProcessTransferSession::UploadTask::progressed(const std::shared_ptr<Core>& core, std::int64_t total,
                                                      std::int64_t expected) {
    {
        std::lock_guard lock(mutex_);
        sent_ = total;
        if (std::exchange(reportPending_, true)) return;
    }
    core->queue->async([task = shared_from_this(), core, expected] { task->reportProgress(*core, expected); });
}

void InProcessTransferSession::UploadTask::reportProgress(const Core& core, std::int64_t expected) {
    std::int64_t total = 0, step = 0;
    {
        std::lock_guard lock(mutex_);
        reportPending_ = false;
        total = sent_;
        step = total - std::exchange(reported_, total);
    }
    if (const auto listener = core.listener()) listener->taskDidSendBodyData(*this, step, total, expected);
}

void InProcessTransferSession::UploadTask::complete(Core& core, const std::optional<AnyError>& error,
                                                    const std::optional<TransferResponse>& response) {
    struct Completed {  // however the delegate comes back
        ~Completed() {
            {
                std::lock_guard lock(task.mutex_);
                task.state_ = State::completed;
            }
            core.remove(task.identifier_);
        }
        UploadTask& task;
        Core& core;
    } completed{*this, core};
    if (const auto listener = core.listener()) listener->taskDidComplete(*this, error, response);
}

std::shared_ptr<InProcessTransferSession::UploadTask> InProcessTransferSession::Core::add(TransferRequest request,
                                                                                          std::filesystem::path file) {
    std::lock_guard lock(mutex_);
    const auto identifier = ++lastIdentifier_;
    auto task = std::make_shared<UploadTask>(weak_from_this(), identifier, std::move(request), std::move(file));
    tasks_.emplace(identifier, task);
    return task;
}

void InProcessTransferSession::Core::remove(std::int64_t identifier) {
    std::shared_ptr<UploadTask> removed;  // let go of outside the lock
    std::lock_guard lock(mutex_);
    if (const auto found = tasks_.find(identifier); found != tasks_.end()) {
        removed = std::move(found->second);
        tasks_.erase(found);
    }
}

void InProcessTransferSession::Core::close() {
    std::map<std::int64_t, std::shared_ptr<UploadTask>> open;
    {
        std::lock_guard lock(mutex_);
        closed_ = true;
        open.swap(tasks_);
    }
    std::vector<TransferThread::Ticket> running;
    for (const auto& [identifier, task] : open) {
        if (const auto ticket = task->close()) running.push_back(ticket);
    }
    TransferThread::cancel(running);
}

std::vector<std::shared_ptr<TransferTask>> InProcessTransferSession::Core::list() const {
    std::lock_guard lock(mutex_);
    std::vector<std::shared_ptr<TransferTask>> listed;
    listed.reserve(tasks_.size());
    for (const auto& [identifier, task] : tasks_) listed.push_back(task);
    return listed;
}

std::shared_ptr<TransferSessionDelegate> InProcessTransferSession::Core::listener() const {
    {
        std::lock_guard lock(mutex_);
        if (closed_) return nullptr;
    }
    return delegate_.lock();
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
    : core_(std::make_shared<Core>(
          resolved(configuration), std::move(delegate),
          queue ? std::move(queue) : std::make_shared<SerialQueue>("com.veskar.corvane.transfer-session"))) {}

InProcessTransferSession::~InProcessTransferSession() {
    core_->close();
}

std::optional<std::string> InProcessTransferSession::description() const {
    return core_->description();
}

void InProcessTransferSession::setDescription(std::string description) {
    core_->setDescription(std::move(description));
}

std::shared_ptr<TransferTask> InProcessTransferSession::uploadTask(TransferRequest request,
                                                                   std::filesystem::path file) {
    return core_->add(std::move(request), std::move(file));
}

// The answer goes through the queue, behind the completions that wait there.
void InProcessTransferSession::tasks(Listing listing) {
    core_->queue->async([core = core_, listing = std::move(listing)] { listing(core->list()); });
}

void InProcessTransferSession::deliverPendingEvents() {
    core_->queue->async([core = core_] {
        if (const auto listener = core->listener()) listener->allEventsDelivered();
    });
}

}  // namespace corvane
