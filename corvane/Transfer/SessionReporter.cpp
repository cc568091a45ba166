#include <corvane/Transfer/SessionReporter.h>

#include <corvane/Platform/HostCall.h>

#include <algorithm>
#include <utility>

namespace corvane {

namespace {

// So that no transaction of the delegate's takes long.
constexpr std::size_t mostTogether = 64;

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
      queue_(queue ? std::move(queue) : std::make_shared<SerialQueue>("com.veskar.corvane.transfer-session")) {
    const auto own = std::dynamic_pointer_cast<OwnDelegate>(delegate_.lock());
    isOwn_ = own != nullptr;
    if (own) progressIsWanted_ = own->progressIsWanted();
}

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

void SessionReporter::enqueueEnd(std::shared_ptr<SessionTask> task, Ending ending, TransferOutcome outcome,
                                 Afterwards afterwards) {
    {
        const Lock lock(mutex_);
        ends_.push_back({std::move(task), ending, std::move(outcome), std::move(afterwards)});
    }
    // One for each, though the first may take all: a queue that is suspended by a callback calls no other.
    enqueue([self = shared_from_this()] { self->reportNext(); });
}

void SessionReporter::reportNext() {
    const auto told = delegate();
    const auto ends = takeNext(isOwn_ && told);
    if (ends.size() > 1) return reportTogether(dynamic_cast<OwnDelegate&>(*told), ends);
    for (const auto& [task, ending, outcome, afterwards] : ends) {
        const bool isTold = reportEnd(*task, ending, outcome);
        if (afterwards) afterwards(isTold);
    }
}

std::vector<SessionReporter::Waiting> SessionReporter::takeNext(bool together) {
    const auto completes = [](const Waiting& one) { return one.ending == &TransferSessionDelegate::taskDidComplete; };
    const Lock lock(mutex_);
    std::size_t count = ends_.empty() ? 0 : 1;
    while (together && count < std::min(ends_.size(), mostTogether) && completes(ends_[count - 1]) &&
           completes(ends_[count])) {
        ++count;
    }
    std::vector<Waiting> taken;
    taken.reserve(count);
    for (; count > 0; --count) {
        taken.push_back(std::move(ends_.front()));
        ends_.pop_front();
    }
    return taken;
}

void SessionReporter::reportTogether(OwnDelegate& delegate, const std::vector<Waiting>& ends) {
    std::deque<Completed> completed;
    std::vector<OwnDelegate::Completion> completions;
    std::vector<bool> isTold;
    for (const auto& one : ends) {
        isTold.push_back(one.task->state() != TransferTask::State::completed);
        if (!isTold.back()) continue;
        completed.emplace_back(*one.task);
        completions.push_back({*one.task, one.outcome});
    }
    callHost("transfer session delegate", [&] { delegate.tasksDidComplete(completions); });
    completed.clear();
    for (std::size_t i = 0; i < ends.size(); ++i) {
        if (ends[i].afterwards) ends[i].afterwards(isTold[i]);
    }
}

void SessionReporter::enqueue(Task report) {
    const auto queue = queue_;  // what is enqueued may hold the last reference to this object
    queue->asyncAhead(std::move(report));
}

bool SessionReporter::wantsProgress() const {
    return !isOwn_ || OwnDelegate::logsProgress() || (progressIsWanted_ && *progressIsWanted_);
}

void SessionReporter::reportProgress(std::shared_ptr<SessionTask> task, std::int64_t total, std::int64_t expected) {
    if (!wantsProgress() || !task->note(total, expected)) return;
    enqueue([self = shared_from_this(), task = std::move(task)] {
        const auto progress = task->takeProgress();
        const auto told = self->delegate();
        if (task->state() == TransferTask::State::completed) return;  // its end was told together with an earlier one
        if (told && progress.step > 0) {
            told->taskDidSendBodyData(*task, progress.step, progress.total, progress.expected);
        }
    });
}

void SessionReporter::reportHoldUp(const std::string& server, bool lasts) {
    enqueue([self = shared_from_this(), server, lasts] {
        const auto own = std::dynamic_pointer_cast<OwnDelegate>(self->delegate());
        if (own) own->serverIsHeldUp(server, lasts);
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
