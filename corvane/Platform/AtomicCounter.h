#pragma once

#include <corvane/Platform/Mutex.h>

#include <cstdint>

namespace corvane {

/// A signed 64-bit count. The lock is held for the length of one read or change only, never while
/// calling out.
class AtomicCounter {
  public:
    [[nodiscard]] std::int64_t value() const {
        const Lock lock(mutex_);
        return value_;
    }
    /// Adds and returns the new value.
    std::int64_t add(std::int64_t difference) {
        const Lock lock(mutex_);
        return value_ += difference;
    }
    /// Sets and returns the value that was there before.
    std::int64_t exchange(std::int64_t value) {
        const Lock lock(mutex_);
        const std::int64_t previous = value_;
        value_ = value;
        return previous;
    }

  private:
    mutable Mutex mutex_;
    std::int64_t value_ CORVANE_GUARDED_BY(mutex_) = 0;
};

}  // namespace corvane
