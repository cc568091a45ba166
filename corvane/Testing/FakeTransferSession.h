#pragma once

#include <corvane/Transfer/TransferError.h>
#include <corvane/Transfer/TransferSession.h>

#include <atomic>
#include <condition_variable>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace corvane::test {

/// A transfer session in memory: tasks end as they were scripted to, or when the test says so, and nothing is sent.
///
/// It keeps the rules of the real ones: callbacks run asynchronously on the queue, a task counts as running until its
/// completion callback has returned, and a listing comes behind what is pending. All operations may be called from any
/// thread.
///
///     std::shared_ptr<FakeTransferSession> session;  // the one that was opened last
///     TransferSession::setFactory(FakeTransferSession::factory(session, {FakeTransferSession::Outcome::status(503)}));
///     ...                                            // the host starts a session, submits events and ends it
///     session->waitForTasks(1);
///     session->task(1)->request.url;
class FakeTransferSession final : public TransferSession, public std::enable_shared_from_this<FakeTransferSession> {
  public:
    /// How a task ends: what the delegate is told.
    struct Outcome {
        std::optional<AnyError> error;
        std::optional<TransferResponse> response;

        /// The server's answer.
        static Outcome status(std::int64_t code, std::map<std::string, std::string> headers = {});
        /// No answer.
        static Outcome failure(TransferError::Code code, std::string message = "scripted");
    };

    /// One upload; numbered from 1 in the order in which they were made. Any thread.
    class Task final : public TransferTask {
      public:
        /// Made by `uploadTask`.
        Task(std::weak_ptr<FakeTransferSession> session, std::int64_t number, TransferRequest sent,
             std::filesystem::path body);

        std::int64_t identifier() const override { return number_; }
        std::optional<std::string> description() const override;
        State state() const override;
        void setDescription(std::string description) override;
        /// Takes the next scripted outcome, if one is left.
        void resume() override;
        /// The task is cancelling, and ends as `scriptCancel` says; one that is over stays as it is.
        void cancel() override;
        /// Whether `cancel` was called, also when it came too late.
        [[nodiscard]] bool wasCancelled() const;
        /// Puts the task into a state, as another process or a lost agent could have.
        void setState(State state);

        const TransferRequest request;
        const std::filesystem::path file;

      private:
        friend class FakeTransferSession;

        const std::weak_ptr<FakeTransferSession> session_;
        const std::int64_t number_;
        mutable std::mutex mutex_;
        State state_ = State::suspended;
        bool wasCancelled_ = false;
        std::optional<std::string> description_;
        std::atomic<std::int64_t> sent_ = 0;  // as was reported
    };

    /// Opens sessions that begin with this script, and puts the newest into `opened`, which must outlive the factory's
    /// use. It is written on the thread that opens the session: for an upload processor, the one that adds it.
    static Factory factory(std::shared_ptr<FakeTransferSession>& opened, std::vector<Outcome> script = {});
    /// Used by the factory: a session must be held by a shared pointer.
    FakeTransferSession(TransferSessionConfiguration given, std::weak_ptr<TransferSessionDelegate> delegate,
                        std::shared_ptr<SerialQueue> queue);

    /// The next tasks that are resumed end so, one each, by themselves; those behind the end of the script run on.
    void script(const Outcome& outcome, int times = 1);
    /// Tasks that are cancelled end so, unless they are over when the queue comes to it; with nothing they go on
    /// cancelling until `complete` ends them. As `TransferError` cancelled by default.
    void scriptCancel(std::optional<Outcome> outcome);
    /// Ends a task, whatever its state; the delegate is told on the queue. Throws `std::out_of_range` for a task that
    /// was not made.
    void complete(std::int64_t identifier, Outcome outcome);
    void complete(std::int64_t identifier, std::int64_t statusCode, std::map<std::string, std::string> headers = {});
    /// Tells the delegate that so much of a running task's body has gone out since the task began. Throws
    /// `std::out_of_range` for a task that was not made.
    void progress(std::int64_t identifier, std::int64_t total, std::int64_t expected);
    /// Tells the delegate that what was pending at a wake-up is delivered.
    void signalAllEventsDelivered();

    /// The tasks so far.
    [[nodiscard]] std::vector<std::shared_ptr<Task>> made() const;
    /// Throws `std::out_of_range` for a task that was not made.
    [[nodiscard]] std::shared_ptr<Task> task(std::int64_t identifier) const;
    /// Waits until this many tasks have been made; false when they were not within ten seconds.
    [[nodiscard]] bool waitForTasks(std::size_t count) const;
    /// How often `deliverPendingEvents` was called.
    [[nodiscard]] int wakeUps() const;

    std::optional<std::string> description() const override;
    void setDescription(std::string description) override;
    std::shared_ptr<TransferTask> uploadTask(TransferRequest request, std::filesystem::path file) override;
    /// Unlike the real sessions it lists completed tasks too, as sessions outside the process may.
    void tasks(Listing listing) override;
    /// Counts the wake-up; the signal is the test's to give.
    void deliverPendingEvents() override;

    const TransferSessionConfiguration configuration;

  private:
    void end(std::shared_ptr<Task> task, Outcome outcome, bool evenCompleted);

    const std::weak_ptr<TransferSessionDelegate> delegate_;
    const std::shared_ptr<SerialQueue> queue_;
    mutable std::mutex mutex_;
    mutable std::condition_variable changed_;
    std::vector<std::shared_ptr<Task>> made_;
    std::deque<Outcome> script_;
    std::optional<Outcome> cancelOutcome_ = Outcome::failure(TransferError::Code::cancelled);
    int wakeUps_ = 0;
    std::optional<std::string> description_;
};

}  // namespace corvane::test
