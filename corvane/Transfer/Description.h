#pragma once

#include <corvane/Platform/Mutex.h>

#include <optional>
#include <string>
#include <utility>

namespace corvane {

/// Text of a session's or a task's owner, for any thread. Internal.
class Description {
  public:
    Description() = default;
    explicit Description(std::optional<std::string> text) : text_(std::move(text)) {}

    [[nodiscard]] std::optional<std::string> get() const {
        Lock lock(mutex_);
        return text_;
    }
    void set(std::string text) {
        Lock lock(mutex_);
        text_ = std::move(text);
    }

  private:
    mutable Mutex mutex_;
    std::optional<std::string> text_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane
