#pragma once

#include <corvane/Transfer/TransferSession.h>

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

namespace corvane::test {

/// A transfer session in memory, in which nothing happens until the test says so.
///
/// It keeps the rules of the real one: callbacks run asynchronously on the queue, a task counts as running until its
/// completion callback has returned, and a listing comes behind what is pending. Thread-safe.
///
///     FakeTransferSession::Shelf shelf;                     // the sessions that a factory opened
///     UploadService service(endpoint, signer, shelf.factory());
///     ...
///     shelf.only()->complete(1, 503);
class FakeTransferSession final : public TransferSession {
  public:
    struct Upload {
        std::int64_t identifier;
        std::optional<std::string> description;
        TransferTask::State state;
        TransferRequest request;
        std::filesystem::path file;
    };

    /// Keeps what its factory opened.
    class Shelf {
      public:
        [[nodiscard]] Factory factory();
        [[nodiscard]] std::size_t count() const;
        /// The only session there is; nothing when there is none or there are more.
        [[nodiscard]] std::shared_ptr<FakeTransferSession> only() const;

      private:
        struct Contents {
            std::mutex mutex;
            std::vector<std::shared_ptr<FakeTransferSession>> sessions;
        };
        std::shared_ptr<Contents> contents_ = std::make_shared<Contents>();
    };

    FakeTransferSession(TransferSessionConfiguration configuration, std::weak_ptr<TransferSessionDelegate> delegate,
                        std::shared_ptr<SerialQueue> queue);
    ~FakeTransferSession() override;

    [[nodiscard]] const TransferSessionConfiguration& configuration() const { return configuration_; }
    /// Every task ever made, in order.
    [[nodiscard]] std::vector<Upload> uploads() const;
    /// How often the session was told of a wake-up.
    [[nodiscard]] int wakeUps() const;

    /// Ends a task with an answer, whatever its state.
    void complete(std::int64_t identifier, std::int64_t statusCode, std::map<std::string, std::string> headers = {});
    /// Ends a task with whatever the delegate is to be told.
    void complete(std::int64_t identifier, std::optional<AnyError> error, std::optional<TransferResponse> response);
    void progress(std::int64_t identifier, std::int64_t sent, std::int64_t total, std::int64_t expected);
    void setState(std::int64_t identifier, TransferTask::State state);
    void signalAllEventsDelivered();

    [[nodiscard]] std::optional<std::string> description() const override;
    void setDescription(std::string description) override;
    std::shared_ptr<TransferTask> uploadTask(TransferRequest request, std::filesystem::path file) override;
    void tasks(Listing listing) override;
    /// Counts the wake-up; the signal is the test's to give.
    void deliverPendingEvents() override;

  private:
    class Task;
    using Tasks = std::vector<std::shared_ptr<Task>>;

    [[nodiscard]] std::shared_ptr<Task> find(std::int64_t identifier) const;
    [[nodiscard]] Tasks all() const;

    const TransferSessionConfiguration configuration_;
    const std::weak_ptr<TransferSessionDelegate> delegate_;
    const std::shared_ptr<SerialQueue> queue_;

    mutable std::mutex mutex_;
    std::optional<std::string> description_;
    Tasks tasks_;
    int wakeUps_ = 0;
};

}  // namespace corvane::test
