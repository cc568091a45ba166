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
    Count pending;    ///< they are kept, and go out again with the next run, or are still on their way
    Count givenUp;    ///< refused by the collector, or dropped: they will not arrive

    bool operator==(const DeliveryReport&) const = default;
};

}  // namespace corvane
