#include <corvane/Agent/Host/InsideTransfers.h>

#include <utility>

namespace corvane {

InsideTransfers::InsideTransfers(TransferSessionConfiguration configuration, std::shared_ptr<SessionReporter> reporter,
                                 std::shared_ptr<TaskTable> tasks)
    : configuration_(std::move(configuration)), reporter_(std::move(reporter)), tasks_(std::move(tasks)) {}

void InsideTransfers::takeOver(const std::shared_ptr<BackgroundTransferTask>& task) {
    if (!task->advanceTo(BackgroundTransferTask::Stage::inside)) return;
    try {
        start(*task);
    } catch (...) {
        reporter_->enqueue([self = shared_from_this(), task, error = AnyError::current()] {
            self->end(*task, {error, std::nullopt});
        });
    }
}

void InsideTransfers::start(BackgroundTransferTask& task) {
    const auto inside = session();
    if (!inside) return;
    const auto inner = inside->uploadTask(task.request(), task.bodyPath());
    inner->setDescription(task.token());
    task.setInner(inner);
    if (task.isCancelled()) inner->cancel();  // whoever cancelled it may not have seen it
    inner->resume();
}

// The session, or nothing once it is closed: the reporter is before this is.
std::shared_ptr<InProcessTransferSession> InsideTransfers::session() {
    Lock lock(mutex_);
    if (reporter_->isClosed()) return nullptr;
    if (!session_) {
        session_ = std::make_shared<InProcessTransferSession>(configuration_, weak_from_this(), reporter_->queue());
    }
    return session_;
}

void InsideTransfers::close() {
    std::shared_ptr<InProcessTransferSession> closed;  // cancelled outside the lock
    Lock lock(mutex_);
    closed.swap(session_);
}

void InsideTransfers::taskDidSendBodyData(const TransferTask& inner, std::int64_t sent, std::int64_t total,
                                          std::int64_t expected) {
    const auto task = tasks_->find(inner.description().value_or(""));
    const auto told = reporter_->delegate();
    if (task && told) told->taskDidSendBodyData(*task, sent, total, expected);
}

void InsideTransfers::taskDidComplete(const TransferTask& inner, const std::optional<AnyError>& error,
                                      const std::optional<TransferResponse>& response) {
    if (const auto task = tasks_->find(inner.description().value_or(""))) end(*task, {error, response});
}

// On the session's queue.
void InsideTransfers::end(BackgroundTransferTask& task, const TransferOutcome& outcome) {
    reporter_->reportEnd(task, &TransferSessionDelegate::taskDidComplete, outcome);
    tasks_->remove(task.token());
}

}  // namespace corvane
