#pragma once

#include <corvane/Platform/Descriptor.h>
#include <corvane/Transfer/CurlTransfer.h>
#include <corvane/Transfer/HTTPTransfer.h>

#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <set>
#include <span>
#include <string>
#include <vector>

struct pollfd;

namespace corvane {

/// Runs HTTP exchanges side by side, with the limit per host: the part of a transfer thread, or of a program's loop,
/// that deals with libcurl. Internal.
///
/// Everything but `wakeUp` is called on one thread, and never from a transfer's functions, which run inside `perform`
/// and `start`. Destroying a scheduler drops what runs without reporting it.
///
///     scheduler.start(1, std::move(transfer));
///     while (!scheduler.isIdle()) {
///         scheduler.perform();                 // transfer.didComplete(...) is called in here
///         scheduler.wait({}, scheduler.millisecondsToDeadline());
///     }
class TransferScheduler {
  public:
    using Ticket = std::uint64_t;
    using Clock = CurlTransfer::Clock;

    /// Sets libcurl up for the process. Throws `std::bad_alloc`, and `SystemError` when there is no descriptor to be
    /// had.
    TransferScheduler();
    TransferScheduler(const TransferScheduler&) = delete;
    TransferScheduler& operator=(const TransferScheduler&) = delete;
    ~TransferScheduler();

    /// Starts a transfer, or lets it wait for others of its host. One that cannot be started is reported at once.
    /// Requires: the ticket is not in use.
    void start(Ticket ticket, HTTPTransfer transfer);

    /// Drops transfers without reporting them; tickets that are not in use are left alone.
    void cancel(const std::set<Ticket>& tickets);

    /// Does what can be done without waiting, and reports the transfers that ended.
    void perform();

    /// Waits until something can be done, one of `others` is ready (their `revents` say so), `wakeUp` is called, or
    /// the time is over.
    void wait(std::span<pollfd> others, int milliseconds);

    /// Ends a wait, this one or the next. Callable from any thread, while the scheduler lives.
    void wakeUp() noexcept;

    [[nodiscard]] bool isIdle() const { return running_.empty() && hosts_.empty(); }

    /// How long `wait` may take before a transfer is out of time; the greatest integer when there is none.
    [[nodiscard]] int millisecondsToDeadline() const;

  private:
    struct Waiting {
        Ticket ticket;
        HTTPTransfer transfer;
    };
    struct Running {
        Ticket ticket;
        std::string host;
        HTTPTransfer transfer;
        std::unique_ptr<CurlTransfer> curl;
    };
    struct Host {
        int running = 0;
        std::deque<Waiting> waiting;
    };
    struct MultiDeleter {
        void operator()(void* multi) const noexcept;
    };

    void startWaiting(const std::string& host);
    void makeRoom();
    void startOne(const std::string& host, Waiting next);
    static void finish(const Running& ended, const auto& error) noexcept;
    void finishEnded();
    void checkProgress();
    Running takeOut(std::vector<Running>::iterator position);

    Descriptor wakeUp_;  // libcurl goes on without one of its own when the process has none left
    std::unique_ptr<void, MultiDeleter> multi_;
    std::map<std::string, Host> hosts_;
    std::vector<Running> running_;
};

}  // namespace corvane
