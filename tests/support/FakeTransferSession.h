#pragma once

#include <corvane/Transfer/TransferSession.h>

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace corvane::test {

/// A transfer session in memory, in which nothing happens until the test says so.
///
/// It keeps the rules of the real one: callbacks run asynchronously on the queue, a task counts as running until its
/// completion callback has returned, and a listing comes behind what is pending. One thread at a time may use it: the
/// test's, and the queue's while the test waits for it.
///
///     std::shared_ptr<FakeTransferSession> session;  // the one that was opened last
///     UploadService service(endpoint, signer, FakeTransferSession::factory(session));
///     ...
///     session->complete(1, 503);
class FakeTransferSession final : public TransferSession {
  public:
    struct Task final : TransferTask {
        Task(std::int64_t number, TransferRequest sent, std::filesystem::path body)
            : request(std::move(sent)), file(std::move(body)), number_(number) {}

        std::int64_t identifier() const override { return number_; }
        std::optional<std::string> description() const override { return description_; }
        State state() const override { return now; }
        void setDescription(std::string description) override { description_ = std::move(description); }
        void resume() override { now = State::running; }

        const TransferRequest request;
        const std::filesystem::path file;
        State now = State::suspended;

      private:
        const std::int64_t number_;
        std::optional<std::string> description_;
    };

    static Factory factory(std::shared_ptr<FakeTransferSession>& opened) {
        return [&opened](auto configuration, auto delegate, auto queue) {
            return opened = std::make_shared<FakeTransferSession>(configuration, delegate, queue);
        };
    }
    FakeTransferSession(TransferSessionConfiguration given, std::weak_ptr<TransferSessionDelegate> delegate,
                        std::shared_ptr<SerialQueue> queue)
        : configuration(std::move(given)), delegate_(std::move(delegate)), queue_(std::move(queue)) {}

    /// Ends a task with an answer, whatever its state.
    void complete(std::int64_t identifier, std::int64_t statusCode, std::map<std::string, std::string> headers = {}) {
        complete(identifier, std::nullopt, TransferResponse{true, statusCode, std::move(headers)});
    }
    /// Ends a task with whatever the delegate is to be told.
    void complete(std::int64_t identifier, std::optional<AnyError> error, std::optional<TransferResponse> response) {
        queue_->async([this, task = made.at(static_cast<std::size_t>(identifier) - 1), error = std::move(error),
                       response = std::move(response)] {
            if (const auto delegate = delegate_.lock()) delegate->taskDidComplete(*task, error, response);
            task->now = TransferTask::State::completed;
        });
    }
    void signalAllEventsDelivered() {
        queue_->async([this] { delegate_.lock()->allEventsDelivered(); });
    }

    std::optional<std::string> description() const override { return description_; }
    void setDescription(std::string description) override { description_ = std::move(description); }
    std::shared_ptr<TransferTask> uploadTask(TransferRequest request, std::filesystem::path file) override {
        const auto number = static_cast<std::int64_t>(made.size()) + 1;
        return made.emplace_back(std::make_shared<Task>(number, std::move(request), std::move(file)));
    }
    /// Unlike the real session it lists completed tasks too, as sessions outside the process may.
    void tasks(Listing listing) override {
        queue_->async([this, listing = std::move(listing)] { listing({made.begin(), made.end()}); });
    }
    /// Counts the wake-up; the signal is the test's to give.
    void deliverPendingEvents() override { ++wakeUps; }

    const TransferSessionConfiguration configuration;
    std::vector<std::shared_ptr<Task>> made;  // in order; the first is task 1
    int wakeUps = 0;

  private:
    const std::weak_ptr<TransferSessionDelegate> delegate_;
    const std::shared_ptr<SerialQueue> queue_;
    std::optional<std::string> description_;
};

}  // namespace corvane::test
