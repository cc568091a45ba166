#pragma once

#include <corvane/Platform/ThreadAnnotations.h>

#include <condition_variable>
#include <mutex>

namespace corvane {

/// A mutex that clang's thread-safety analysis knows: members say with CORVANE_GUARDED_BY which one they need.
class CORVANE_CAPABILITY("mutex") Mutex {
  public:
    void lock() CORVANE_ACQUIRE() { mutex_.lock(); }
    void unlock() CORVANE_RELEASE() { mutex_.unlock(); }

  private:
    friend class Lock;
    std::mutex mutex_;
};

/// Holds a Mutex until its end, or until `unlock`.
class CORVANE_SCOPED_CAPABILITY Lock {
  public:
    explicit Lock(Mutex& mutex) CORVANE_ACQUIRE(mutex) : lock_(mutex.mutex_) {}
    ~Lock() CORVANE_RELEASE() = default;
    Lock(const Lock&) = delete;
    Lock& operator=(const Lock&) = delete;

    void unlock() CORVANE_RELEASE() { lock_.unlock(); }
    void lock() CORVANE_ACQUIRE() { lock_.lock(); }

    /// Waits for the condition's signal; the mutex is free meanwhile. Wait in a loop that looks at the state: the
    /// analysis does not follow a predicate. Requires: the mutex is held.
    void wait(std::condition_variable& condition) { condition.wait(lock_); }
    /// The same until a moment; false when that has come.
    template <class Moment>
    bool waitUntil(std::condition_variable& condition, const Moment& deadline) {
        return condition.wait_until(lock_, deadline) == std::cv_status::no_timeout;
    }

  private:
    std::unique_lock<std::mutex> lock_;
};

}  // namespace corvane
