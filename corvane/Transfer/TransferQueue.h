#pragma once

#include <corvane/Transfer/TransferScheduler.h>

#include <list>
#include <map>
#include <set>
#include <string>
#include <vector>

namespace corvane {

/// Transfers that wait their turn: so many run at once to one host and port as their limits allow, and the others wait
/// in the order in which they came. The limit of the process's own transfers; the transfer agent has its own, which
/// knows of failures. Internal.
///
/// Everything but `wakeUp` is called on one thread. Destroying a queue drops what runs and waits without reporting it.
class TransferQueue {
  public:
    using Ticket = TransferScheduler::Ticket;

    /// Lets a transfer run when its turn has come, in `perform`. One that cannot be taken is reported at once.
    /// Requires: the ticket is not in use.
    void start(Ticket ticket, HTTPTransfer transfer);
    /// Stops transfers, which then have ended with `TransferError` cancelled; tickets that are not in use are left
    /// alone.
    void cancel(const std::set<Ticket>& tickets);
    /// Does what can be done without waiting, and reports the transfers that ended.
    void perform();
    /// Waits until something can be done, or `wakeUp` is called.
    void wait() { scheduler_.wait({}, scheduler_.millisecondsToDeadline()); }
    /// Ends a wait, this one or the next. Callable from any thread.
    void wakeUp() noexcept { scheduler_.wakeUp(); }

  private:
    struct Waiting {
        Ticket ticket;
        HTTPTransfer transfer;
    };
    struct Host {
        std::vector<Ticket> running;
        std::list<Waiting> waiting;
    };

    void startWaiting();
    void startWaiting(Host& host);

    TransferScheduler scheduler_;
    std::map<std::string, Host> hosts_;
};

}  // namespace corvane
