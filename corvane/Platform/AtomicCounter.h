#pragma once

#include <cstdint>
#include <mutex>

namespace corvane {

/// A signed 64-bit count. The lock is held for the length of one read or change only, never while
/// calling out.
class AtomicCounter {
  public:
    [[nodiscard]] std::int64_t value() const {
        std::lock_guard lock(mutex_);
        return value_;
    }
    /// Adds and returns the new value.
    std::int64_t add(std::int64_t difference) {
        std::lock_guard lock(mutex_);
        return value_ += difference;
    }
    /// Sets and returns the value that was there before.
    std::int64_t exchange(std::int64_t value) {
        std::lock_guard lock(mutex_);
        const std::int64_t previous = value_;
        value_ = value;
        return previous;
    }

  private:
    mutable std::mutex mutex_;
    std::int64_t value_ = 0;
};

}  // namespace corvane
