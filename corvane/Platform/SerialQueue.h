#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/FunctionRef.h>
#include <corvane/Platform/Task.h>
#include <corvane/Platform/ThreadAnnotations.h>

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <type_traits>
#include <utility>

namespace corvane {

class QueueTimers;
struct TimerEntry;

/// A first-in, first-out queue of tasks, of which at most one runs at any time.
///
/// The queue owns one thread, started with its first asynchronous task; the thread carries the last
/// part of the label as its name, blocks all signals, and a background queue's thread is niced. All
/// operations may be called from any thread. Whoever holds a reference may release it anywhere, in
/// a task of this queue too: what was enqueued before the last release still runs (a suspended
/// queue is resumed for it), and no destructor ever waits.
///
/// A child made by `fork` has no thread for the queue: there `async` keeps the task for good without running it, and
/// `sync` stops the child with a message.
///
///     SerialQueue queue("com.example.work");
///     queue.async([] { ... });                    // returns at once
///     int n = queue.sync([] { return 42; });      // on this thread when the queue is idle
class CORVANE_EXPORT CORVANE_CAPABILITY("queue") SerialQueue {
  public:
    enum class QualityOfService {
        default_,    ///< the process's own priority
        background,  ///< work nobody waits for: a lower thread priority
    };

    explicit SerialQueue(std::string label, QualityOfService qualityOfService = QualityOfService::default_);
    SerialQueue(const SerialQueue&) = delete;
    SerialQueue& operator=(const SerialQueue&) = delete;
    ~SerialQueue();

    [[nodiscard]] const std::string& label() const noexcept;

    /// Enqueues a task and returns. What the task throws is logged at error level, and the next
    /// task runs. The task's captures are destroyed on the queue, right after it ran.
    void async(Task task);

    /// Enqueues a task that shares the end of its run with those around it. What the queue has at hand of such tasks is
    /// one run: what they leave to its end (`atEndOfRun`) is done once, behind the last of them, and before anything
    /// else: any other task, a suspension, a wait for more. A run ends early when much waits for its end, or for long.
    void asyncInRun(Task task);

    /// What happens at the end of a run, in this order.
    enum class RunEnd {
        write,   ///< what makes the run's effects last
        report,  ///< what may be told once they do
    };
    /// Leaves a task to the end of the run that is under way, behind those that were left before. Any task is in a run,
    /// one that shares it with nobody too. What the task throws is logged.
    /// Requires: the caller is on this queue (the process is stopped with a message).
    void atEndOfRun(RunEnd part, Task task);
    /// Does at once what was left to the end of the run; inside a report only the writes, since the reports behind it
    /// are on their way.
    /// Requires: the caller is on this queue (the process is stopped with a message).
    void endRun();

    /// Enqueues a task ahead of all that `async` and `asyncInRun` have enqueued; tasks ahead keep their order among
    /// themselves. For results that must not wait behind new work. It is in no run and ends none.
    void asyncAhead(Task task);

    /// Runs `function` on the queue, after everything enqueued before, and returns its result or
    /// rethrows what it threw. When the queue is idle and not suspended it runs on the caller's
    /// thread; otherwise the caller waits. When the process has no thread left for the queue, the caller runs what was
    /// enqueued before, too. Either way the function is on this queue and still on
    /// every queue the caller was on.
    ///
    /// Requires: the caller is not on this queue (it would wait for itself; the process is stopped
    /// with a message).
    template <class F>
    CORVANE_LOCAL auto sync(F&& function) -> std::invoke_result_t<F&> {
        using Result = std::invoke_result_t<F&>;
        if constexpr (std::is_void_v<Result>) {
            runSync(function);
        } else {
            std::optional<Result> result;
            runSync([&] { result.emplace(function()); });
            return *std::move(result);
        }
    }

    /// Stops the queue after the task that is running. Nests: as many resumes are needed as there
    /// were suspensions.
    void suspend();
    /// Requires: the queue is suspended (otherwise the process is stopped with a message).
    void resume();

    /// How many tasks wait: those that were enqueued and have not begun, callers that wait in `sync` included. Others
    /// enqueue and run meanwhile, so it is exact at no moment. It costs about what `async` does. In a child made by
    /// `fork` it is 0.
    [[nodiscard]] std::uint64_t waitingCount() const;

    /// Whether the calling code runs on this queue.
    [[nodiscard]] bool isCurrent() const noexcept;

    /// Stops the process with a message that names `operation` and the queue unless the calling
    /// code runs on it.
    void assertCurrent(const char* operation) const CORVANE_ASSERT_CAPABILITY(this);

    /// Stops the process with a message that names `operation` and the queue if the calling code
    /// runs on it.
    void assertNotCurrent(const char* operation) const;

  private:
    friend class Timer;
    struct State;

    [[noreturn]] void failElsewhere(const char* operation) const;
    void enqueue(Task&& task, bool isAhead);
    void runSync(FunctionRef<void()> function);
    CORVANE_LOCAL std::shared_ptr<QueueTimers> addTimer(std::shared_ptr<TimerEntry> timer);

    const std::shared_ptr<State> state_;
};

}  // namespace corvane
