#pragma once

#include <corvane/Platform/Mutex.h>

#include <functional>
#include <optional>
#include <utility>

namespace corvane {

/// A value made by its load block on first use, under a lock, and kept. A load block that throws
/// leaves the value unmade: the error reaches the caller, and the next use tries again.
template <class T>
class Lazy {
  public:
    explicit Lazy(std::function<T()> load) : load_(std::move(load)) {}

    /// The value; the reference is good as long as this object. Callable from any thread.
    const T& value() const {
        const Lock lock(mutex_);
        if (!value_) {
            value_.emplace(load_());
            load_ = nullptr;
        }
        return *value_;
    }

  private:
    mutable Mutex mutex_;
    mutable std::function<T()> load_ CORVANE_GUARDED_BY(mutex_);
    mutable std::optional<T> value_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane
