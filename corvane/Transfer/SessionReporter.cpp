#include <corvane/Transfer/SessionReporter.h>

#include <corvane/Platform/HostCall.h>

#include <utility>

namespace corvane {

namespace {

// Completes a task at its end, however the delegate comes back.
class Completed {
  public:
    explicit Completed(SessionTask& task) : task_(task) {}
    Completed(const Completed&) = delete;
    Completed& operator=(const Completed&) = delete;
    ~Completed() { task_.complete(); }

  private:
    SessionTask& task_;
};

}  // namespace

SessionReporter::SessionReporter(std::weak_ptr<TransferSessionDelegate> delegate, std::shared_ptr<SerialQueue> queue)
    : delegate_(std::move(delegate)),
      queue_(queue ? std::move(queue) : std::make_shared<SerialQueue>("com.veskar.corvane.transfer-session")) {}

void SessionReporter::close() {
    Lock lock(mutex_);
    closed_ = true;
}

bool SessionReporter::isClosed() const {
    Lock lock(mutex_);
    return closed_;
}

std::shared_ptr<TransferSessionDelegate> SessionReporter::delegate() const {
    return isClosed() ? nullptr : delegate_.lock();
}

bool SessionReporter::reportEnd(SessionTask& task, Ending ending, const TransferOutcome& outcome) {
    queue_->assertCurrent("SessionReporter::reportEnd");
    const auto told = delegate();
    if (!told || task.state() == TransferTask::State::completed) return false;
    const Completed completed(task);
    callHost("transfer session delegate", [&] { ((*told).*ending)(task, outcome.error, outcome.response); });
    return true;
}

void SessionReporter::enqueue(Task report) {
    const auto queue = queue_;  // what is enqueued may hold the last reference to this object
    queue->asyncAhead(std::move(report));
}

void SessionReporter::reportProgress(std::shared_ptr<SessionTask> task, std::int64_t total, std::int64_t expected) {
    if (!task->note(total, expected)) return;
    enqueue([self = shared_from_this(), task = std::move(task)] {
        const auto progress = task->takeProgress();
        const auto told = self->delegate();
        if (told && progress.step > 0) {
            told->taskDidSendBodyData(*task, progress.step, progress.total, progress.expected);
        }
    });
}

void SessionReporter::answer(TransferSession::Listing listing, List list) {
    enqueue([listing = std::move(listing), list = std::move(list)] { listing(list()); });
}

void SessionReporter::signalDelivered() {
    enqueue([self = shared_from_this()] {
        if (const auto told = self->delegate()) told->allEventsDelivered();
    });
}

}  // namespace corvane
