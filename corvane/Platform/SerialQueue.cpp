#include <corvane/Platform/SerialQueue.h>

#include <corvane/Platform/ForkMark.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/QueueTimers.h>
#include <corvane/Platform/Require.h>
#include <corvane/Platform/TaskList.h>
#include <corvane/Platform/Thread.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <deque>
#include <exception>
#include <utility>

namespace corvane {

namespace {

// The queues that the code running on this thread is on, innermost first. A task that sync() runs
// is on its queue and on every queue of the thread that waits for it, also when it runs on another
// thread.
struct Frame {
    const void* queue;
    const Frame* outer;
};
thread_local const Frame* currentFrame = nullptr;

class FrameScope {
  public:
    FrameScope(const void* queue, const Frame* outer) : previous_(currentFrame), frame_{queue, outer} {
        currentFrame = &frame_;
    }
    FrameScope(const FrameScope&) = delete;
    FrameScope& operator=(const FrameScope&) = delete;
    ~FrameScope() { currentFrame = previous_; }

  private:
    const Frame* previous_;
    Frame frame_;
};

bool isOn(const void* queue) noexcept {
    for (const Frame* frame = currentFrame; frame; frame = frame->outer) {
        if (frame->queue == queue) return true;
    }
    return false;
}

void runGuarded(Task& task, const std::string& label) noexcept {
    try {
        task();
    } catch (...) {
        Log::shared().error("Task failed, queue=%{public}@, error=%{public}@", label, AnyError::current().what());
    }
    task.reset();
}

// Keeps a task for good: in a child made by fork nothing runs it, and destroying what it holds could wait for ever.
void abandon(Task task) {
    struct Abandoned {
        Mutex mutex;
        std::deque<Task> tasks CORVANE_GUARDED_BY(mutex);
    };
    static auto& abandoned = *new Abandoned;
    const Lock lock(abandoned.mutex);
    abandoned.tasks.push_back(std::move(task));
}

}  // namespace

struct SerialQueue::State {
    using Clock = std::chrono::steady_clock;
    // So many reports, or so long, are as much as one end is worth waiting for.
    static constexpr std::size_t longestRun = 512;
    static constexpr auto longestWait = std::chrono::milliseconds(20);

    State(std::string name, QualityOfService quality) : label(std::move(name)), qualityOfService(quality) {}

    const std::string label;
    const QualityOfService qualityOfService;
    const ForkMark born;

    Mutex mutex;
    std::condition_variable wake;      // the worker waits here
    std::condition_variable syncDone;  // callers of sync() wait here
    TaskList waiting CORVANE_GUARDED_BY(mutex);
    TaskList waitingAhead CORVANE_GUARDED_BY(mutex);
    std::uint64_t enqueued CORVANE_GUARDED_BY(mutex) = 0;  // how many tasks there ever were
    bool running CORVANE_GUARDED_BY(mutex) = false;        // somebody, the worker or an inline sync(), is running tasks
    bool asleep CORVANE_GUARDED_BY(mutex) = false;         // the worker waits for `wake`
    bool workerStarted CORVANE_GUARDED_BY(mutex) = false;
    bool startFailed CORVANE_GUARDED_BY(mutex) = false;  // there was no thread to be had, which has been logged
    bool closed CORVANE_GUARDED_BY(mutex) = false;  // the last reference is gone; the worker ends when nothing is left
    // Written under the mutex; the worker reads them without between two tasks.
    std::atomic<int> suspensions = 0;
    std::atomic<bool> hasAhead = false;
    QueueTimers timers;
    int timerProblem CORVANE_GUARDED_BY(mutex) = 0;  // of the system, which has been logged

    // Of whoever runs tasks: what was left to the end of the run.
    TaskList writes;
    TaskList reports;
    std::size_t reportCount = 0;
    Clock::time_point runEndsBy;
    bool isReporting = false;
    // How many of `enqueued` were begun. Written by whoever runs tasks, and read from any thread.
    std::atomic<std::uint64_t> begun = 0;

    bool suspended() const noexcept { return suspensions.load(std::memory_order_relaxed) > 0; }

    static void startWorker(const std::shared_ptr<State>& state);
    void work();
    void sleep(Lock& lock) CORVANE_REQUIRES(mutex);
    int sleepUntilTimer(Lock& lock) CORVANE_REQUIRES(mutex);
    void takeDue() CORVANE_REQUIRES(mutex);
    void wakeWorker();
    void workUntil(const bool& done, Lock& lock) CORVANE_REQUIRES(mutex);
    void runTaken(TaskList& taken);
    [[nodiscard]] Task begin(TaskList& taken) noexcept;
    void waitWhileSuspended();
    void runAhead();
    void leave(RunEnd part, Task task);
    [[nodiscard]] bool isRunLong() const;
    void endRun() noexcept;
};

// Requires: `running` was false and has just been checked under the lock together with
// `workerStarted`.
void SerialQueue::State::startWorker(const std::shared_ptr<State>& state) {
    try {
        startDetachedThread(state->label, state->qualityOfService == QualityOfService::background,
                            [state] { state->work(); });
    } catch (const std::exception& error) {  // no thread, or no memory for one
        bool isNews = false;
        {
            const Lock lock(state->mutex);
            isNews = !std::exchange(state->startFailed, true);
            state->workerStarted = false;  // what waits stays; the next call tries again
            state->syncDone.notify_all();  // whoever waits for the queue sees to it now
        }
        if (!isNews) return;
        Log::shared().error("Failed to start thread, queue=%{public}@, error=%{public}@", state->label, error.what());
    }
}

void SerialQueue::State::work() {
    TaskList taken;
    Lock lock(mutex);
    startFailed = false;
    for (;;) {
        takeDue();
        while (running || (waiting.empty() && waitingAhead.empty()) || suspended()) {
            if (closed && waiting.empty() && waitingAhead.empty()) return;
            sleep(lock);
            takeDue();
        }
        running = true;
        taken.takeAll(waiting);
        lock.unlock();
        runTaken(taken);
        lock.lock();
        running = false;
    }
}

void SerialQueue::State::sleep(Lock& lock) {
    asleep = true;
    const int problem = timers.isEmpty() || suspended() ? (lock.wait(wake), 0) : sleepUntilTimer(lock);
    asleep = false;
    if (std::exchange(timerProblem, problem) == problem || problem == 0) return;
    mutex.unlock();
    Log::shared().error("Timers may be late, queue=%{public}@, error=%{public}@", label,
                        SystemError("make a timer", problem).what());
    mutex.lock();
}

// Returns why the system does not wait for the timer. Then it is looked after now and then, by a clock that stands
// still while the machine is suspended.
int SerialQueue::State::sleepUntilTimer(Lock& lock) {
    if (const int problem = timers.prepareWait()) {
        const auto longest = std::chrono::minutes(timerProblem == 0 ? 0 : 1);  // not before it is in the log
        lock.waitUntil(wake, Clock::now() + std::min<Clock::duration>(timers.untilNext(), longest));
        return problem;
    }
    mutex.unlock();
    timers.wait();
    mutex.lock();
    return 0;
}

void SerialQueue::State::takeDue() {
    if (!timers.isEmpty() && !suspended() && !closed) enqueued += timers.takeDue(waiting);
}

void SerialQueue::State::wakeWorker() {
    wake.notify_one();
    timers.wakeUp();
}

// For a caller that waits for its own task on a queue without a thread: runs what waits, in order, where it is. `done`
// is guarded by the mutex.
void SerialQueue::State::workUntil(const bool& done, Lock& lock) {
    while (!done) {
        if (workerStarted || running || suspended()) {
            lock.wait(syncDone);
            continue;
        }
        TaskList taken;
        taken.takeAll(waiting);
        running = true;
        mutex.unlock();
        runTaken(taken);
        mutex.lock();
        running = false;
        if (workerStarted) wakeWorker();
        syncDone.notify_all();
    }
}

void SerialQueue::State::runTaken(TaskList& taken) {
    FrameScope scope(this, nullptr);
    runAhead();
    while (!taken.empty()) {
        waitWhileSuspended();
        runAhead();
        Task task = begin(taken);
        if (!task.isInRun() || isRunLong()) endRun();
        runGuarded(task, label);
    }
    endRun();
}

// One thread at a time runs tasks, so nothing is lost between the load and the store.
Task SerialQueue::State::begin(TaskList& taken) noexcept {
    begun.store(begun.load(std::memory_order_relaxed) + 1, std::memory_order_relaxed);
    return taken.pop();
}

void SerialQueue::State::waitWhileSuspended() {
    if (!suspended()) return;
    endRun();
    Lock lock(mutex);
    while (suspended()) lock.wait(wake);
}

void SerialQueue::State::runAhead() {
    while (hasAhead.load(std::memory_order_relaxed)) {
        TaskList taken;
        {
            const Lock lock(mutex);
            taken.takeAll(waitingAhead);
            hasAhead = false;
        }
        while (!taken.empty()) {
            waitWhileSuspended();
            Task task = begin(taken);
            runGuarded(task, label);
        }
    }
}

void SerialQueue::State::leave(RunEnd part, Task task) {
    if (writes.empty() && reports.empty()) runEndsBy = Clock::now() + longestWait;
    (part == RunEnd::write ? writes : reports).push(std::move(task));
    if (part == RunEnd::report) ++reportCount;
}

bool SerialQueue::State::isRunLong() const {
    return reportCount >= longestRun || (!(writes.empty() && reports.empty()) && Clock::now() >= runEndsBy);
}

// What is left meanwhile is done too. A report that ends the run anew, for what it has done itself, is not to run those
// behind it inside of it.
void SerialQueue::State::endRun() noexcept {
    const bool isNested = isReporting;
    while (!writes.empty() || !(isNested || reports.empty())) {
        isReporting = isNested || writes.empty();
        if (writes.empty()) --reportCount;
        Task task = (writes.empty() ? reports : writes).pop();
        runGuarded(task, label);
    }
    isReporting = isNested;
}

SerialQueue::SerialQueue(std::string label, QualityOfService qualityOfService)
    : state_(std::make_shared<State>(std::move(label), qualityOfService)) {}

SerialQueue::~SerialQueue() {
    if (state_->born.isInChild()) return;
    Lock lock(state_->mutex);
    state_->closed = true;
    state_->suspensions = 0;
    const bool start = !state_->workerStarted && !(state_->waiting.empty() && state_->waitingAhead.empty());
    if (start) state_->workerStarted = true;
    lock.unlock();
    if (start) State::startWorker(state_);
    state_->wakeWorker();
}

const std::string& SerialQueue::label() const noexcept {
    return state_->label;
}

void SerialQueue::async(Task task) {
    enqueue(std::move(task), false);
}

void SerialQueue::asyncInRun(Task task) {
    task.setInRun();
    enqueue(std::move(task), false);
}

void SerialQueue::asyncAhead(Task task) {
    enqueue(std::move(task), true);
}

void SerialQueue::atEndOfRun(RunEnd part, Task task) {
    assertCurrent("SerialQueue::atEndOfRun");
    state_->leave(part, std::move(task));
}

void SerialQueue::endRun() {
    assertCurrent("SerialQueue::endRun");
    state_->endRun();
}

void SerialQueue::enqueue(Task&& task, bool isAhead) {
    State& state = *state_;
    if (state.born.isInChild()) return abandon(std::move(task));
    bool wake = false;
    bool start = false;
    {
        const Lock lock(state.mutex);
        (isAhead ? state.waitingAhead : state.waiting).push(std::move(task));
        ++state.enqueued;
        if (isAhead) state.hasAhead = true;
        if (!state.workerStarted) {
            state.workerStarted = start = true;
        } else {
            // Whoever runs tasks looks again before it stops, so only a sleeping worker needs a
            // call.
            wake = state.asleep && !state.running && !state.suspended();
        }
    }
    if (start) State::startWorker(state_);
    if (wake) state.wakeWorker();
}

std::shared_ptr<QueueTimers> SerialQueue::addTimer(std::shared_ptr<TimerEntry> timer) {
    State& state = *state_;
    if (state.born.isInChild()) {
        abandon([timer = std::move(timer)] {});
        return nullptr;
    }
    state.timers.add(std::move(timer));
    bool wake = false;
    bool start = false;
    {
        const Lock lock(state.mutex);
        start = !std::exchange(state.workerStarted, true);
        wake = state.asleep;  // it has another time to wait for
    }
    if (start) State::startWorker(state_);
    if (wake) state.wakeWorker();
    return {state_, &state.timers};
}

void SerialQueue::runSync(FunctionRef<void()> function) {
    CORVANE_REQUIRE(!isCurrent(), "sync on the queue it is already on would wait for itself, queue=" + label());
    State& state = *state_;
    CORVANE_REQUIRE(
        !state.born.isInChild(),
        "a child made by fork cannot wait for a queue of its parent; it may exec or _exit, queue=" + label());
    Lock lock(state.mutex);
    if (!state.running && state.waiting.empty() && state.waitingAhead.empty() && !state.suspended()) {
        state.running = true;
        lock.unlock();
        struct Finish {
            ~Finish() {
                bool wake = false;
                {
                    const Lock guard(state->mutex);
                    state->running = false;
                    wake = state->asleep && (!state->waiting.empty() || !state->waitingAhead.empty() || state->closed);
                    if (!state->workerStarted) state->syncDone.notify_all();
                }
                if (wake) state->wakeWorker();
            }
            std::shared_ptr<State> state;  // the function may release the queue
        } finish{state_};
        FrameScope scope(&state, currentFrame);
        struct RunEnder {
            ~RunEnder() { state.endRun(); }
            State& state;
        } ender{state};
        function();
        return;
    }

    const auto held = state_;  // the last reference to the queue may go while the caller waits
    struct Call {
        FunctionRef<void()> function;
        const Frame* outer;
        std::exception_ptr error;
        bool done = false;
    } call{function, currentFrame, nullptr};
    state.waiting.push([&call, &state] {
        try {
            FrameScope scope(&state, call.outer);
            call.function();
        } catch (...) {
            call.error = std::current_exception();
        }
        state.endRun();
        const Lock guard(state.mutex);
        call.done = true;
        state.syncDone.notify_all();
    });
    ++state.enqueued;
    const bool start = !state.workerStarted;
    state.workerStarted = true;
    const bool wake = state.asleep && !state.running && !state.suspended();
    lock.unlock();
    if (start) State::startWorker(held);
    if (wake) state.wakeWorker();
    lock.lock();
    state.workUntil(call.done, lock);
    lock.unlock();
    if (call.error) std::rethrow_exception(call.error);
}

void SerialQueue::suspend() {
    const Lock lock(state_->mutex);
    ++state_->suspensions;
}

void SerialQueue::resume() {
    {
        const Lock lock(state_->mutex);
        CORVANE_REQUIRE(state_->suspended(), "resume of a queue that is not suspended, queue=" + label());
        --state_->suspensions;
    }
    state_->wake.notify_all();  // the worker, or a caller that works in its place
    state_->timers.wakeUp();
    state_->syncDone.notify_all();
}

std::uint64_t SerialQueue::waitingCount() const {
    if (state_->born.isInChild()) return 0;
    const Lock lock(state_->mutex);
    return state_->enqueued - state_->begun.load(std::memory_order_relaxed);
}

bool SerialQueue::isCurrent() const noexcept {
    return isOn(state_.get());
}

void SerialQueue::assertCurrent(const char* operation) const {
    // By itself, without what a message takes: every step of an event asks.
    if (!isOn(state_.get())) [[unlikely]]
        failElsewhere(operation);
}

void SerialQueue::failElsewhere(const char* operation) const {
    fail(std::string(operation) + " must run on queue " + label());
}

void SerialQueue::assertNotCurrent(const char* operation) const {
    CORVANE_REQUIRE(!isCurrent(), std::string(operation) + " must not be called on queue " + label());
}

}  // namespace corvane
