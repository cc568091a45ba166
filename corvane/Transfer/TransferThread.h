#pragma once

#include <corvane/Transfer/HTTPTransfer.h>

#include <cstdint>
#include <vector>

namespace corvane {

/// The one thread of the process on which all HTTP exchanges run.
///
/// Started by the first transfer and asleep while there is nothing to do. It opens body files, talks to servers and
/// calls the transfers' functions; it never waits for anybody. When the process exits it is stopped and joined before
/// the libraries under it are taken down; transfers that are not over by then, and later ones, never run. In a child
/// made by fork there is no such thread, and transfers never run. Callable from any thread.
class TransferThread {
  public:
    /// Names a transfer for cancelling; 0 is the ticket of one that failed at once.
    using Ticket = std::uint64_t;

    /// Hands a transfer over. Failures of any kind, to start the thread too, end up in its `didComplete`.
    static Ticket start(HTTPTransfer transfer);

    /// Stops transfers, all at once, as soon as the thread gets to it: they then have ended with `TransferError`
    /// cancelled. Transfers that are over are left alone. Requires: tickets that `start` gave, other than 0.
    static void cancel(const std::vector<Ticket>& tickets);
};

}  // namespace corvane
