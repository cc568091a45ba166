#pragma once

#include <corvane/Platform/HTTPTransfer.h>
#include <corvane/Platform/TransferScheduler.h>

#include <chrono>
#include <cstdint>
#include <deque>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace corvane::transferd {

/// The uploads that are not over, by host: so many at a time run as the host may have, and a host that cannot be
/// reached is left alone for a delay that doubles from failure to failure. After a failure one upload at a time tries
/// the host, until one gets through.
class UploadQueue {
  public:
    using Clock = TransferScheduler::Clock;

    struct Ended {
        std::int64_t number;
        std::optional<AnyError> error;
        std::optional<TransferResponse> response;
    };
    struct Progress {
        std::int64_t number;
        std::int64_t total;
        std::int64_t expected;
    };

    /// Where the queue has its transfers from.
    class Source {
      public:
        virtual ~Source() = default;
        /// The transfer of an upload that is about to start; nothing when it is not to start any more. May throw, which
        /// ends the upload. Its functions are the queue's to set.
        virtual std::optional<HTTPTransfer> transfer(std::int64_t number) = 0;
        /// Whether an upload whose server cannot be reached is to be tried again.
        virtual bool mayWait(std::int64_t number) = 0;
    };

    UploadQueue(Source& source, std::chrono::milliseconds retryDelay) : source_(source), retryDelay_(retryDelay) {}

    /// What uploads are counted by. Throws `TransferError` for a request that cannot be sent.
    [[nodiscard]] static std::string hostKey(const TransferRequest& request);

    void add(std::int64_t number, const std::string& host, int perHost);
    /// Drops an upload, whether it runs or waits.
    void remove(std::int64_t number);

    /// Starts what may start, and does what can be done without waiting.
    void proceed(Clock::time_point now);
    [[nodiscard]] std::vector<Ended> takeEnded() { return std::exchange(ended_, {}); }
    [[nodiscard]] std::vector<Progress> takeProgress() { return std::exchange(progress_, {}); }

    void wait(std::span<pollfd> others, int milliseconds) { scheduler_.wait(others, milliseconds); }
    /// How long `wait` may take; the greatest integer when nothing is due by itself.
    [[nodiscard]] int millisecondsToDeadline(Clock::time_point now) const;
    [[nodiscard]] bool isEmpty() const { return hosts_.empty(); }
    /// Whether every upload waits for a host that cannot be reached.
    [[nodiscard]] bool isStalled(Clock::time_point now) const;

  private:
    struct Waiting {
        std::int64_t number;
        int perHost;
    };
    struct Host {
        std::deque<Waiting> waiting;
        std::map<std::int64_t, Waiting> running;
        int failures = 0;
        Clock::time_point pausedUntil = Clock::time_point::min();

        [[nodiscard]] bool mayStart(Clock::time_point now) const;
    };

    void startOne(Host& host);
    void finished(Ended ended, Clock::time_point now);
    void settle(std::map<std::string, Host>::iterator host);

    Source& source_;
    const std::chrono::milliseconds retryDelay_;
    TransferScheduler scheduler_;
    std::map<std::string, Host> hosts_;
    std::vector<Ended> arrived_;  // while the scheduler works
    std::vector<Ended> ended_;
    std::vector<Progress> progress_;
};

}  // namespace corvane::transferd
