#pragma once

#include <corvane/Platform/ThreadAnnotations.h>

#include <shared_mutex>

namespace corvane {

/// A mutex for many readers or one writer that clang's thread-safety analysis knows.
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
