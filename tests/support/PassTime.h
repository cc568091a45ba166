#pragma once

#include <corvane/Platform/BootClock.h>
#include <corvane/Platform/SerialQueue.h>

#include <future>

namespace corvane::test {

/// Lets time pass without waiting for it, and returns when the queue's timers that are due then have fired.
inline void passTime(SerialQueue& queue, BootClock::duration time = {}) {
    BootClock::advance(time);
    for (int i = 0; i < 2; ++i) {  // a timer is behind what is enqueued when it comes due
        std::promise<void> reached;
        queue.async([&] { reached.set_value(); });
        reached.get_future().wait();
    }
}

}  // namespace corvane::test
