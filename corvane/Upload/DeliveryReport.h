#pragma once

#include <cstdint>

namespace corvane {

/// What became of the documents that a process handed over, and of the events in them. A value.
struct DeliveryReport {
    struct Count {
        std::int64_t events = 0;  ///< known for documents of this run; those of earlier runs count none
        std::int64_t documents = 0;
        bool operator==(const Count&) const = default;
    };

    Count delivered;  ///< the collector has them
    Count pending;    ///< they are kept, and go out again with the next run or after `retryDelay`, or are on their way
    Count givenUp;    ///< refused by the collector, or dropped: they will not arrive

    bool operator==(const DeliveryReport&) const = default;
};

/// What a wait for delivery waits for. A value.
struct DeliveryWaitOptions {
    /// Do not wait for documents that wait for a server which is known to be unreachable: a transfer to the endpoint
    /// has ended, since they were handed over, for want of a connection or because the way to the server is blocked
    /// (`TransferError` unreachable or blocked), or the transfer agent has said that it holds the endpoint's uploads up
    /// for that reason. That is forgotten when the server answers, whatever it says, when part of a document goes out,
    /// and when the agent says that it goes on or is lost; a document that is handed over later is waited for until it
    /// fails, too, unless the agent holds it up. A server that takes the connection and says nothing is not
    /// unreachable.
    bool onlyWhileReachable = false;
};

}  // namespace corvane
