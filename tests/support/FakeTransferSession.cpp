#include "tests/support/FakeTransferSession.h"

#include <stdexcept>
#include <utility>

namespace corvane::test {

class FakeTransferSession::Task final : public TransferTask {
  public:
    Task(std::int64_t identifier, TransferRequest request, std::filesystem::path file)
        : upload_{identifier, std::nullopt, State::suspended, std::move(request), std::move(file)} {}

    std::int64_t identifier() const override { return snapshot().identifier; }
    std::optional<std::string> description() const override { return snapshot().description; }
    State state() const override { return snapshot().state; }
    void setDescription(std::string description) override {
        std::lock_guard lock(mutex_);
        upload_.description = std::move(description);
    }
    void resume() override {
        std::lock_guard lock(mutex_);
        if (upload_.state == State::suspended) upload_.state = State::running;
    }
    void setState(State state) {
        std::lock_guard lock(mutex_);
        upload_.state = state;
    }
    Upload snapshot() const {
        std::lock_guard lock(mutex_);
        return upload_;
    }

  private:
    mutable std::mutex mutex_;
    Upload upload_;
};

TransferSession::Factory FakeTransferSession::Shelf::factory() {
    return [contents = contents_](auto configuration, auto delegate, auto queue) {
        auto session =
            std::make_shared<FakeTransferSession>(std::move(configuration), std::move(delegate), std::move(queue));
        std::lock_guard lock(contents->mutex);
        contents->sessions.push_back(session);
        return session;
    };
}

std::size_t FakeTransferSession::Shelf::count() const {
    std::lock_guard lock(contents_->mutex);
    return contents_->sessions.size();
}

std::shared_ptr<FakeTransferSession> FakeTransferSession::Shelf::only() const {
    std::lock_guard lock(contents_->mutex);
    return contents_->sessions.size() == 1 ? contents_->sessions.front() : nullptr;
}

FakeTransferSession::FakeTransferSession(TransferSessionConfiguration configuration,
                                         std::weak_ptr<TransferSessionDelegate> delegate,
                                         std::shared_ptr<SerialQueue> queue)
    : configuration_(std::move(configuration)),
      delegate_(std::move(delegate)),
      queue_(queue ? std::move(queue) : std::make_shared<SerialQueue>("fake-transfer-session")) {}

FakeTransferSession::~FakeTransferSession() = default;

std::vector<FakeTransferSession::Upload> FakeTransferSession::uploads() const {
    std::vector<Upload> uploads;
    for (const auto& task : all()) uploads.push_back(task->snapshot());
    return uploads;
}

int FakeTransferSession::wakeUps() const {
    std::lock_guard lock(mutex_);
    return wakeUps_;
}

void FakeTransferSession::complete(std::int64_t identifier, std::int64_t statusCode,
                                   std::map<std::string, std::string> headers) {
    complete(identifier, std::nullopt,
             TransferResponse{.isHTTP = true, .statusCode = statusCode, .headers = std::move(headers)});
}

void FakeTransferSession::complete(std::int64_t identifier, std::optional<AnyError> error,
                                   std::optional<TransferResponse> response) {
    queue_->async(
        [task = find(identifier), weak = delegate_, error = std::move(error), response = std::move(response)] {
            if (const auto delegate = weak.lock()) delegate->taskDidComplete(*task, error, response);
            task->setState(TransferTask::State::completed);
        });
}

void FakeTransferSession::progress(std::int64_t identifier, std::int64_t sent, std::int64_t total,
                                   std::int64_t expected) {
    queue_->async([task = find(identifier), weak = delegate_, sent, total, expected] {
        if (const auto delegate = weak.lock()) delegate->taskDidSendBodyData(*task, sent, total, expected);
    });
}

void FakeTransferSession::setState(std::int64_t identifier, TransferTask::State state) {
    find(identifier)->setState(state);
}

void FakeTransferSession::signalAllEventsDelivered() {
    queue_->async([weak = delegate_] {
        if (const auto delegate = weak.lock()) delegate->allEventsDelivered();
    });
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
    const auto identifier = static_cast<std::int64_t>(tasks_.size()) + 1;
    tasks_.push_back(std::make_shared<Task>(identifier, std::move(request), std::move(file)));
    return tasks_.back();
}

// Unlike the real session it lists completed tasks too, as sessions outside the process may.
void FakeTransferSession::tasks(Listing listing) {
    queue_->async([tasks = all(), listing = std::move(listing)] { listing({tasks.begin(), tasks.end()}); });
}

void FakeTransferSession::deliverPendingEvents() {
    std::lock_guard lock(mutex_);
    ++wakeUps_;
}

std::shared_ptr<FakeTransferSession::Task> FakeTransferSession::find(std::int64_t identifier) const {
    for (const auto& task : all()) {
        if (task->identifier() == identifier) return task;
    }
    throw std::logic_error("there is no task " + std::to_string(identifier));
}

FakeTransferSession::Tasks FakeTransferSession::all() const {
    std::lock_guard lock(mutex_);
    return tasks_;
}

}  // namespace corvane::test
