#pragma once

#include <corvane/Platform/BootClock.h>
#include <corvane/Platform/Descriptor.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/Task.h>
#include <corvane/Platform/TaskList.h>

#include <atomic>
#include <chrono>
#include <cstddef>
#include <memory>
#include <vector>

namespace corvane {

/// One timer, held by its queue until it fires.
struct TimerEntry {
    BootClock::time_point due;
    Task task;
    std::atomic<bool> isOver = false;  // begun or cancelled
};

/// The timers of one serial queue, and how its worker waits for them: in the system, on a descriptor that follows the
/// boot-time clock. There is none, and nothing is asked of the system, until a timer is set. Safe from any thread, but
/// for the two calls of the worker. Internal: see `Timer`.
class QueueTimers {
  public:
    void add(std::shared_ptr<TimerEntry> entry);
    /// Lets go of a timer; harmless for one that is not there (any more).
    void remove(const TimerEntry& entry);
    /// Whether there is nothing to wait for. While the process exits there never is.
    [[nodiscard]] bool isEmpty() const noexcept { return isEmpty_.load() || isExiting_.load(); }
    /// Puts the tasks of the timers that are due behind `tasks`, in the order of their times. Returns how many.
    std::size_t takeDue(TaskList& tasks) noexcept;

    /// For the worker: gets ready to `wait` for the next timer, and for `wakeUp` from now on. Returns 0, or the number
    /// of the system's error when it has no descriptor for it.
    int prepareWait();
    /// For the worker, after `prepareWait`: waits until a timer is due, or somebody wakes it up.
    void wait() noexcept;
    /// Ends a wait that was prepared.
    void wakeUp() const noexcept;
    /// How long it is until the next timer is due; for whoever cannot `wait`.
    [[nodiscard]] BootClock::duration untilNext() const;

    /// No timer fires any more once this was called, by the exit handler of whoever sets the first one.
    static void processExits() noexcept { isExiting_ = true; }

  private:
    using Entries = std::vector<std::shared_ptr<TimerEntry>>;

    /// The one that is due next; the end when there is none.
    [[nodiscard]] static Entries::const_iterator next(const Entries& entries);

    static inline std::atomic<bool> isExiting_ = false;

    std::atomic<bool> isEmpty_ = true;
    std::atomic<bool> isWaiting_ = false;

    // The worker's.
    Descriptor timer_;
    Descriptor wakeUp_;
    BootClock::time_point armedFor_;

    mutable Mutex mutex_;
    Entries entries_ CORVANE_GUARDED_BY(mutex_);  // few: a search is cheaper than an order
};

}  // namespace corvane
