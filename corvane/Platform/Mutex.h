#pragma once

#include <corvane/Platform/ThreadAnnotations.h>

#include <condition_variable>
#include <mutex>
#include <shared_mutex>

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

/// The same for many readers or one writer.
class CORVANE_CAPABILITY("mutex") SharedMutex {
  public:
    void lock() CORVANE_ACQUIRE() { mutex_.lock(); }
    void unlock() CORVANE_RELEASE() { mutex_.unlock(); }
    void lock_shared() CORVANE_ACQUIRE_SHARED() { mutex_.lock_shared(); }
    void unlock_shared() CORVANE_RELEASE_SHARED() { mutex_.unlock_shared(); }

  private:
    std::shared_mutex mutex_;
};

/// Holds a SharedMutex for reading.
class CORVANE_SCOPED_CAPABILITY ReadLock {
  public:
    explicit ReadLock(SharedMutex& mutex) CORVANE_ACQUIRE_SHARED(mutex) : mutex_(mutex) { mutex.lock_shared(); }
    ~ReadLock() CORVANE_RELEASE() { mutex_.unlock_shared(); }
    ReadLock(const ReadLock&) = delete;
    ReadLock& operator=(const ReadLock&) = delete;

  private:
    SharedMutex& mutex_;
};

/// Holds a SharedMutex for writing.
class CORVANE_SCOPED_CAPABILITY WriteLock {
  public:
    explicit WriteLock(SharedMutex& mutex) CORVANE_ACQUIRE(mutex) : mutex_(mutex) { mutex.lock(); }
    ~WriteLock() CORVANE_RELEASE() { mutex_.unlock(); }
    WriteLock(const WriteLock&) = delete;
    WriteLock& operator=(const WriteLock&) = delete;

  private:
    SharedMutex& mutex_;
};

}  // namespace corvane
