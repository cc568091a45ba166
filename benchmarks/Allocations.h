#pragma once

#include <cstdint>

namespace corvane::bench {

/// What operator new has given out in this process so far.
struct Allocations {
    std::int64_t count = 0;
    std::int64_t inUse = 0;  ///< bytes not given back, as the allocator rounds them
    std::int64_t peak = 0;   ///< the most of them since `restartPeak`

    static Allocations now();
    static void restartPeak();
};

}  // namespace corvane::bench
