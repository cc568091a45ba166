#pragma once

#include <corvane/Agent/TransferSubmission.h>
#include <corvane/Transfer/HTTPTransfer.h>
#include <corvane/Transfer/TransferScheduler.h>

#include <chrono>
#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace corvane::transferd {

/// The uploads that are not over, by host, and by the proxy and the trust with which they go there: so many at a time
/// run as the host may have, and a host that cannot be reached, or that the way to is blocked, is left alone for a
/// delay that doubles from failure to failure. After a failure one upload at a time tries the host, each in its turn,
/// until one gets through.
///
///     open    -> paused      an upload was held up; the others that run are not stopped
///     paused  -> trying      the delay is over: one upload
///     trying  -> paused      held up again: the next one in turn, after twice the delay
///     trying  -> open        it got through, or failed in a way that says nothing of the host
///
/// Times are the caller's, so that every delay is counted from the moment of the call.
class UploadQueue {
  public:
    using Clock = TransferScheduler::Clock;

    struct Ended {
        std::int64_t number;
        TransferOutcome outcome;
    };
    struct Progress {
        std::int64_t number;
        std::int64_t total;
        std::int64_t expected;
    };

    /// Why the uploads to a host wait.
    struct Trouble {
        std::uint64_t id;  ///< another one when it is of another kind
        std::string server;
        std::string reason;
        bool isBlocked = false;
        bool lasts = true;
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
        /// These uploads to a host begin to wait, or all of them go on, or none is left. Not to call back.
        virtual void troubleChanged(const Trouble& trouble, const std::vector<std::int64_t>& uploads) = 0;
    };

    UploadQueue(Source& source, std::chrono::milliseconds retryDelay) : source_(source), retryDelay_(retryDelay) {}

    /// What tells the transfers to one host apart that do not go there in the same way.
    [[nodiscard]] static std::string pool(const TransferSubmission& submission);

    /// Lets an upload wait for its turn. Throws `TransferError` for a request that cannot be sent.
    void add(std::int64_t number, const TransferSubmission& submission);
    /// Drops an upload, whether it runs or waits.
    void remove(std::int64_t number);

    /// Starts what may start, and does what can be done without waiting.
    void proceed(Clock::time_point now);
    /// The uploads that are over, for whoever takes them out.
    [[nodiscard]] std::deque<Ended>& ended() { return ended_; }
    [[nodiscard]] std::vector<Progress> takeProgress() { return std::exchange(progress_, {}); }

    void wait(std::span<pollfd> others, int milliseconds) { scheduler_.wait(others, milliseconds); }
    /// How long `wait` may take; the greatest integer when nothing is due by itself.
    [[nodiscard]] int millisecondsToDeadline(Clock::time_point now) const;
    [[nodiscard]] bool isEmpty() const { return hosts_.empty(); }
    /// Whether every upload waits for a host that cannot be reached.
    [[nodiscard]] bool isStalled(Clock::time_point now) const;
    /// Whether there are uploads, and every host of theirs has failed the last time.
    [[nodiscard]] bool isHopeless() const;
    void visitTroubles(const std::function<void(const Trouble&, const std::vector<std::int64_t>&)>& visit) const;

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
        std::string server;
        std::optional<Trouble> trouble;

        [[nodiscard]] std::vector<std::int64_t> uploads() const;
        [[nodiscard]] bool mayStart(Clock::time_point now) const;
    };

    /// Starts the upload that has waited longest, unless its source has none for it any more.
    void startOne(Host& host);
    void run(Host& host, const Waiting& next, HTTPTransfer transfer);
    /// An upload has come back: it is over, or it waits again.
    void finished(const Ended& ended, Clock::time_point now);
    /// The host answers: opens it, and says so where it was in trouble.
    void goOn(Host& host);
    void tellOver(Host& host);
    /// The host does not answer: pauses it, and ends the uploads that have waited long enough.
    void holdUp(Host& host, const AnyError& why, Clock::time_point now);
    /// Says why a host's uploads wait, unless that was the last thing said of it.
    void note(Host& host, const AnyError& why);
    /// Forgets a host with nothing to do, with what is known of it: nobody would say later that it answers.
    void settle(std::map<std::string, Host>::iterator host);

    Source& source_;
    const std::chrono::milliseconds retryDelay_;
    TransferScheduler scheduler_;
    std::map<std::string, Host> hosts_;
    std::deque<Ended> arrived_;  // while the scheduler works
    std::deque<Ended> ended_;
    std::uint64_t lastTrouble_ = 0;
    std::vector<Progress> progress_;
};

}  // namespace corvane::transferd
