#pragma once

#include <corvane/Platform/Descriptor.h>
#include <corvane/Transfer/CurlTransfer.h>
#include <corvane/Transfer/HTTPTransfer.h>

#include <cstdint>
#include <memory>
#include <set>
#include <span>
#include <vector>

struct pollfd;

namespace corvane {

/// Runs HTTP exchanges side by side, all that it is given: the part of a transfer thread, or of a program's loop, that
/// deals with libcurl. How many may run at once is its owner's affair. Internal.
///
/// Everything but `wakeUp` is called on one thread, and never from a transfer's functions, which run inside `perform`
/// and `start`. Destroying a scheduler drops what runs without reporting it.
///
///     scheduler.start(1, std::move(transfer));
///     while (scheduler.isRunning(1)) {
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

    /// Starts a transfer. One that cannot be started is reported at once, which `false` tells of. Requires: the ticket
    /// is not in use.
    bool start(Ticket ticket, HTTPTransfer transfer);

    /// Stops transfers, which then have ended with `TransferError` cancelled; tickets that are not in use are left
    /// alone.
    void cancel(const std::set<Ticket>& tickets);

    /// Does what can be done without waiting, and reports the transfers that ended.
    void perform();

    /// Waits until something can be done, one of `others` is ready (their `revents` say so), `wakeUp` is called, or
    /// the time is over.
    void wait(std::span<pollfd> others, int milliseconds);

    /// Ends a wait, this one or the next. Callable from any thread, while the scheduler lives.
    void wakeUp() noexcept;

    [[nodiscard]] bool isRunning(Ticket ticket) const;

    /// How long `wait` may take before a transfer is out of time; the greatest integer when there is none.
    [[nodiscard]] int millisecondsToDeadline() const;

    /// Reports the exception that is being handled as a transfer's end: one that never ends would be worse than one
    /// whose ending there is no memory for. Requires: called inside a `catch` block.
    static void reportFailure(const HTTPTransfer& transfer) noexcept;
    /// Reports that a transfer was cancelled before it started.
    static void reportCancelled(const HTTPTransfer& transfer) noexcept;

  private:
    struct Running {
        Ticket ticket;
        HTTPTransfer transfer;
        std::unique_ptr<CurlTransfer> curl;
    };
    struct MultiDeleter {
        void operator()(void* multi) const noexcept;
    };

    void makeRoom();
    static void finish(const Running& ended, const auto& error) noexcept;
    void finishEnded();
    void checkProgress();
    Running takeOut(std::vector<Running>::iterator position);

    Descriptor wakeUp_;  // libcurl goes on without one of its own when the process has none left
    std::unique_ptr<void, MultiDeleter> multi_;
    std::vector<Running> running_;
};

}  // namespace corvane
