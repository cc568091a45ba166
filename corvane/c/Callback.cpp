#include <corvane/c/Callback.h>

#include <corvane/Platform/ForkMark.h>
#include <corvane/Platform/HostCall.h>
#include <corvane/Platform/Mutex.h>

#include <atomic>
#include <map>

namespace corvane::c {

/// What all calls go through whose contexts have one destroying function.
class Gate {
  public:
    /// Never destroyed: calls come as long as the process lives.
    static Gate& of(corvane_destroy destroy) {
        static Mutex& mutex = *new Mutex;
        static auto& gates = *new std::map<corvane_destroy, Gate>;
        thread_local corvane_destroy last = nullptr;
        thread_local Gate* lastGate = nullptr;
        if (!lastGate || last != destroy) {
            Lock lock(mutex);
            lastGate = &gates[destroy];
            last = destroy;
        }
        return *lastGate;
    }

    [[nodiscard]] bool enter() noexcept {
        running_.fetch_add(1);
        if (!isStopped_) return true;
        leave();
        return false;
    }
    void leave() noexcept {
        running_.fetch_sub(1);
        if (isStopped_) running_.notify_all();
    }
    void stop() {
        isStopped_ = true;
        if (Entered::isInside(*this)) return;  // two such calls would wait for each other
        for (int running = running_; running > 0; running = running_) running_.wait(running);
    }

  private:
    std::atomic<int> running_ = 0;
    std::atomic<bool> isStopped_ = false;
};

namespace {
constinit thread_local const Entered* innermost = nullptr;
}  // namespace

Entered::Entered(Gate& gate, bool mayWait) noexcept
    : gate_(gate), mayWait_(mayWait), isIn_(gate.enter()), outer_(innermost) {
    innermost = this;
}

Entered::~Entered() {
    innermost = outer_;
    if (isIn_) gate_.leave();
}

bool Entered::forbidsWaiting() noexcept {
    for (const Entered* entered = innermost; entered; entered = entered->outer_) {
        if (!entered->mayWait_) return true;
    }
    return false;
}

bool Entered::isInside(const Gate& gate) noexcept {
    for (const Entered* entered = innermost; entered; entered = entered->outer_) {
        if (&entered->gate_ == &gate && entered->isIn_) return true;
    }
    return false;
}

struct Context::Owned {
    Owned(void* given, corvane_destroy function) : pointer(given), destroy(function), gate(Gate::of(function)) {}
    Owned(const Owned&) = delete;
    Owned& operator=(const Owned&) = delete;
    ~Owned() {
        if (!destroy) return;
        const Entered entered(gate, false);
        if (entered) callHost("destroy", [this] { destroy(pointer); });
    }

    void* const pointer;
    const corvane_destroy destroy;
    Gate& gate;
};

Context::Context(void* pointer, corvane_destroy destroy) {
    try {
        owned_ = std::make_shared<const Owned>(pointer, destroy);
    } catch (...) {
        if (destroy) callHost("destroy", [&] { destroy(pointer); });
        throw;
    }
}

void* Context::pointer() const {
    return owned_->pointer;
}
Gate& Context::gate() const {
    return owned_->gate;
}

void stopCallbacks(corvane_destroy destroy) {
    Gate::of(destroy).stop();
}

}  // namespace corvane::c
