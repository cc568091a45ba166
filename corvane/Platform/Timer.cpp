#include <corvane/Platform/Timer.h>

#include <algorithm>
#include <cstdlib>
#include <utility>

namespace corvane {

namespace {

// A host's static objects may have gone by then, and its headers or processors with them.
void stopAtExit() {
    static const int registered = std::atexit([] { QueueTimers::processExits(); });
    static_cast<void>(registered);
}

}  // namespace

Timer Timer::after(SerialQueue& queue, std::chrono::nanoseconds delay, Task task) {
    using namespace std::chrono_literals;
    stopAtExit();
    const auto entry = std::make_shared<TimerEntry>();
    entry->due = BootClock::now() + std::clamp<std::chrono::nanoseconds>(delay, 0ns, std::chrono::years(10));
    entry->task = std::move(task);
    Timer timer;
    timer.entry_ = entry;
    timer.timers_ = queue.addTimer(entry);
    return timer;
}

Timer& Timer::operator=(Timer&& other) noexcept {
    Timer old(std::move(*this));
    entry_ = std::move(other.entry_);
    timers_ = std::move(other.timers_);
    set_ = other.set_;
    return *this;
}

bool Timer::isSet() const noexcept {
    const auto entry = entry_.lock();
    return entry && !entry->isOver;
}

void Timer::cancel() noexcept {
    const auto entry = std::exchange(entry_, {}).lock();
    if (!entry || entry->isOver.exchange(true) || set_.isInChild()) return;
    if (const auto timers = timers_.lock()) timers->remove(*entry);
}

}  // namespace corvane
