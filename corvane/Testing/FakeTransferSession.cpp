#include <corvane/Testing/FakeTransferSession.h>

#include <chrono>

namespace corvane::test {

FakeTransferSession::Outcome FakeTransferSession::Outcome::status(std::int64_t code,
                                                                  std::map<std::string, std::string> headers) {
    return {std::nullopt, TransferResponse{true, code, std::move(headers)}};
}

FakeTransferSession::Outcome FakeTransferSession::Outcome::failure(TransferError::Code code, std::string message) {
    return {AnyError(TransferError(code, std::move(message))), std::nullopt};
}

FakeTransferSession::Task::Task(std::weak_ptr<FakeTransferSession> session, std::int64_t number, TransferRequest sent,
                                std::filesystem::path body)
    : request(std::move(sent)), file(std::move(body)), session_(std::move(session)), number_(number) {}

std::optional<std::string> FakeTransferSession::Task::description() const {
    std::lock_guard lock(mutex_);
    return description_;
}

void FakeTransferSession::Task::setDescription(std::string description) {
    std::lock_guard lock(mutex_);
    description_ = std::move(description);
}

TransferTask::State FakeTransferSession::Task::state() const {
    std::lock_guard lock(mutex_);
    return state_;
}

void FakeTransferSession::Task::setState(State state) {
    std::lock_guard lock(mutex_);
    state_ = state;
}

void FakeTransferSession::Task::resume() {
    {
        std::lock_guard lock(mutex_);
        if (state_ != State::suspended) return;
        state_ = State::running;
    }
    const auto session = session_.lock();
    if (!session) return;
    std::optional<Outcome> outcome;
    {
        std::lock_guard lock(session->mutex_);
        if (session->script_.empty()) return;
        outcome = std::move(session->script_.front());
        session->script_.pop_front();
    }
    session->complete(number_, *std::move(outcome));
}

void FakeTransferSession::Task::cancel() {
    {
        std::lock_guard lock(mutex_);
        const bool isFirst = !std::exchange(wasCancelled_, true);
        if (!isFirst || state_ == State::completed) return;
        state_ = State::cancelling;
    }
    const auto session = session_.lock();
    if (!session) return;
    std::optional<Outcome> outcome;
    {
        std::lock_guard lock(session->mutex_);
        outcome = session->cancelOutcome_;
    }
    if (outcome) session->end(session->task(number_), *std::move(outcome), false);
}

bool FakeTransferSession::Task::wasCancelled() const {
    std::lock_guard lock(mutex_);
    return wasCancelled_;
}

TransferSession::Factory FakeTransferSession::factory(std::shared_ptr<FakeTransferSession>& opened,
                                                      std::vector<Outcome> script) {
    return [&opened, script = std::move(script)](auto given, auto delegate, auto queue) {
        opened = std::make_shared<FakeTransferSession>(given, delegate, queue);
        for (const auto& outcome : script) opened->script(outcome);
        return opened;
    };
}

FakeTransferSession::FakeTransferSession(TransferSessionConfiguration given,
                                         std::weak_ptr<TransferSessionDelegate> delegate,
                                         std::shared_ptr<SerialQueue> queue)
    : configuration(std::move(given)),
      delegate_(std::move(delegate)),
      queue_(queue ? std::move(queue) : std::make_shared<SerialQueue>("com.veskar.corvane.fake-transfers")) {}

void FakeTransferSession::script(const Outcome& outcome, int times) {
    std::lock_guard lock(mutex_);
    script_.insert(script_.end(), static_cast<std::size_t>(times), outcome);
}

void FakeTransferSession::scriptCancel(std::optional<Outcome> outcome) {
    std::lock_guard lock(mutex_);
    cancelOutcome_ = std::move(outcome);
}

void FakeTransferSession::complete(std::int64_t identifier, Outcome outcome) {
    end(task(identifier), std::move(outcome), true);
}

void FakeTransferSession::end(std::shared_ptr<Task> task, Outcome outcome, bool evenCompleted) {
    // The session may be gone when the queue comes to it: then nothing is reported, as the real ones keep it.
    queue_->async([session = weak_from_this(), ended = std::move(task), outcome = std::move(outcome), evenCompleted] {
        const auto open = session.lock();
        if (!open || (!evenCompleted && ended->state() == TransferTask::State::completed)) return;
        if (const auto delegate = open->delegate_.lock()) {
            delegate->taskDidComplete(*ended, outcome.error, outcome.response);
        }
        ended->setState(TransferTask::State::completed);
    });
}

void FakeTransferSession::complete(std::int64_t identifier, std::int64_t statusCode,
                                   std::map<std::string, std::string> headers) {
    complete(identifier, Outcome::status(statusCode, std::move(headers)));
}

void FakeTransferSession::progress(std::int64_t identifier, std::int64_t total, std::int64_t expected) {
    const auto running = task(identifier);
    const auto sent = total - running->sent_.exchange(total);
    queue_->async([session = weak_from_this(), running, sent, total, expected] {
        const auto open = session.lock();
        const auto delegate = open ? open->delegate_.lock() : nullptr;
        if (delegate) delegate->taskDidSendBodyData(*running, sent, total, expected);
    });
}

void FakeTransferSession::signalAllEventsDelivered() {
    queue_->async([delegate = delegate_] {
        if (const auto told = delegate.lock()) told->allEventsDelivered();
    });
}

std::vector<std::shared_ptr<FakeTransferSession::Task>> FakeTransferSession::made() const {
    std::lock_guard lock(mutex_);
    return made_;
}

std::shared_ptr<FakeTransferSession::Task> FakeTransferSession::task(std::int64_t identifier) const {
    std::lock_guard lock(mutex_);
    return made_.at(static_cast<std::size_t>(identifier) - 1);
}

bool FakeTransferSession::waitForTasks(std::size_t count) const {
    std::unique_lock lock(mutex_);
    return changed_.wait_for(lock, std::chrono::seconds(10), [&] { return made_.size() >= count; });
}

int FakeTransferSession::wakeUps() const {
    std::lock_guard lock(mutex_);
    return wakeUps_;
}

std::optional<std::string> FakeTransferSession::description() const {
    std::lock_guard lock(mutex_);
    return description_;
}

void FakeTransferSession::setDescription(std::string description) {
    std::lock_guard lock(mutex_);
    description_ = std::move(description);
}

std::shared_ptr<TransferTask> FakeTransferSession::uploadTask(TransferRequest request, std::filesystem::path file) {
    std::lock_guard lock(mutex_);
    const auto number = static_cast<std::int64_t>(made_.size()) + 1;
    made_.push_back(std::make_shared<Task>(weak_from_this(), number, std::move(request), std::move(file)));
    changed_.notify_all();
    return made_.back();
}

void FakeTransferSession::tasks(Listing listing) {
    queue_->async([session = weak_from_this(), listing = std::move(listing)] {
        const auto open = session.lock();
        if (!open) return;
        const auto all = open->made();
        listing({all.begin(), all.end()});
    });
}

void FakeTransferSession::deliverPendingEvents() {
    std::lock_guard lock(mutex_);
    ++wakeUps_;
}

}  // namespace corvane::test
