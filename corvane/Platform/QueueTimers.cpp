#include <corvane/Platform/QueueTimers.h>

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/timerfd.h>

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <exception>
#include <utility>

namespace corvane {

namespace {

using std::chrono::nanoseconds;
using std::chrono::seconds;

timespec timespecOf(nanoseconds time) {
    const auto whole = std::chrono::duration_cast<seconds>(time);
    return {.tv_sec = whole.count(), .tv_nsec = (time - whole).count()};
}

}  // namespace

BootClock::time_point BootClock::now() noexcept {
    timespec time{};
    clock_gettime(CLOCK_BOOTTIME, &time);
    return time_point(seconds(time.tv_sec) + nanoseconds(time.tv_nsec) + advanced());
}

void QueueTimers::add(std::shared_ptr<TimerEntry> entry) {
    const Lock lock(mutex_);
    entries_.push_back(std::move(entry));
    isEmpty_ = false;
}

void QueueTimers::remove(const TimerEntry& entry) {
    std::shared_ptr<TimerEntry> removed;  // its task goes behind the lock
    const Lock lock(mutex_);
    const auto found =
        std::find_if(entries_.begin(), entries_.end(), [&](const auto& one) { return one.get() == &entry; });
    if (found == entries_.end()) return;
    removed = std::move(*found);
    entries_.erase(found);
    isEmpty_ = entries_.empty();
}

QueueTimers::Entries::const_iterator QueueTimers::next(const Entries& entries) {
    return std::min_element(entries.begin(), entries.end(),
                            [](const auto& one, const auto& other) { return one->due < other->due; });
}

std::size_t QueueTimers::takeDue(TaskList& tasks) noexcept {
    std::size_t count = 0;
    const auto now = BootClock::now();
    const Lock lock(mutex_);
    for (auto due = next(entries_); due != entries_.end() && (*due)->due <= now; due = next(entries_)) {
        try {
            tasks.push([entry = *due] {
                if (!isExiting_ && !entry->isOver.exchange(true)) entry->task();
            });
            entries_.erase(due);
            ++count;
        } catch (const std::exception&) {  // no memory: it is tried again, and not in a spin
            (*due)->due = now + std::chrono::milliseconds(50);
        }
    }
    isEmpty_ = entries_.empty();
    return count;
}

int QueueTimers::prepareWait() {
    if (!wakeUp_) wakeUp_ = Descriptor(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK));
    if (!wakeUp_) return errno;
    if (!timer_) {
        timer_ = Descriptor(timerfd_create(CLOCK_BOOTTIME, TFD_CLOEXEC | TFD_NONBLOCK));
        armedFor_ = {};
    }
    if (!timer_) return errno;
    {
        const Lock lock(mutex_);
        const auto found = next(entries_);
        const auto due = found == entries_.end() ? armedFor_ : (*found)->due - BootClock::advanced();
        if (due != armedFor_) {
            // A time of 0 would be none.
            const auto time = timespecOf(std::max(due.time_since_epoch(), nanoseconds(1)));
            const itimerspec armed{.it_interval = {}, .it_value = time};
            if (timerfd_settime(timer_.get(), TFD_TIMER_ABSTIME, &armed, nullptr) != 0) return errno;
            armedFor_ = due;
        }
    }
    isWaiting_ = true;
    return 0;
}

void QueueTimers::wait() noexcept {
    pollfd polled[] = {{wakeUp_.get(), POLLIN, 0}, {timer_.get(), POLLIN, 0}};
    poll(polled, std::size(polled), -1);
    isWaiting_ = false;
    if (polled[0].revents == 0) return;
    eventfd_t ignored = 0;
    eventfd_read(wakeUp_.get(), &ignored);
}

void QueueTimers::wakeUp() const noexcept {
    if (isWaiting_) eventfd_write(wakeUp_.get(), 1);
}

BootClock::duration QueueTimers::untilNext() const {
    const Lock lock(mutex_);
    const auto found = next(entries_);
    return found == entries_.end() ? BootClock::duration::max() : (*found)->due - BootClock::now();
}

}  // namespace corvane
