#pragma once

#include <corvane/Platform/ForkMark.h>
#include <corvane/Platform/QueueTimers.h>
#include <corvane/Platform/SerialQueue.h>

#include <chrono>
#include <memory>

namespace corvane {

/// Runs a task on a serial queue when some time has passed, unless it is cancelled before, which its end does too.
///
/// The time is that of the boot-time clock: what comes due while the machine is suspended fires right after. The
/// queue's own worker waits for it, so that it takes no thread, and no descriptor while no timer is set. On the queue
/// it is a task like any other, behind what was enqueued before its time: a suspended queue runs it after its
/// resumption. A timer whose queue has gone never fires, nor does one in a child made by `fork`, nor while the process
/// exits. Without a thread or descriptors to be had, which is logged, it fires when there are some, or up to a minute
/// late.
///
/// A movable value; it is set, moved and cancelled by one thread at a time. Internal.
///
///     timer_ = Timer::after(*queue_, delay, [weak = weak_from_this()] { ... });
class Timer {
  public:
    /// One that is not set.
    Timer() = default;
    /// Sets a timer. A time below zero is none, one beyond ten years is ten years. Throws `std::bad_alloc`.
    [[nodiscard]] static Timer after(SerialQueue& queue, std::chrono::nanoseconds delay, Task task);
    Timer(Timer&&) noexcept = default;
    Timer& operator=(Timer&& other) noexcept;
    ~Timer() { cancel(); }

    /// Whether its task has neither begun nor been cancelled.
    [[nodiscard]] bool isSet() const noexcept;
    /// On its queue: the task does not begin any more. Elsewhere it may be running.
    void cancel() noexcept;

  private:
    std::weak_ptr<TimerEntry> entry_;
    std::weak_ptr<QueueTimers> timers_;
    ForkMark set_;
};

}  // namespace corvane
