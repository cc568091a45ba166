#pragma once

#include <corvane/Platform/BootClock.h>
#include <corvane/Platform/SerialQueue.h>

#include <future>

namespace corvane::test {

/// Lets time pass once the queue has run what is enqueued, without waiting for it, and returns when the queue's timers
/// that are due then have fired.
inline void passTime(SerialQueue& queue, BootClock::duration time = {}) {
    queue.async([=] { BootClock::advance(time); });
    for (int i = 0; i < 3; ++i) {  // a timer may be behind what was enqueued when its time had come
        std::promise<void> reached;
        queue.async([&] { reached.set_value(); });
        reached.get_future().wait();
    }
}

}  // namespace corvane::test
