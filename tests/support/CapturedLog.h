#pragma once

#include <corvane/Platform/Log.h>

#include <condition_variable>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

namespace corvane::test {

/// Takes the library's log while it lives, at debug level, so that a test can look at what was
/// written.
class CapturedLog {
  public:
    struct Line {
        LogLevel level;
        std::string message;
    };

    CapturedLog();
    ~CapturedLog();

    [[nodiscard]] std::vector<Line> lines() const;
    /// How many messages hold `text`, at any level.
    [[nodiscard]] int count(std::string_view text) const;
    /// Whether a message of exactly this level and text was written.
    [[nodiscard]] bool has(LogLevel level, std::string_view message) const;
    /// Waits until a message holds `text`; false when it did not come within ten seconds.
    [[nodiscard]] bool waitFor(std::string_view text) const;

  private:
    struct State {
        std::mutex mutex;
        std::condition_variable changed;
        std::vector<Line> lines;
    };
    std::shared_ptr<State> state_ = std::make_shared<State>();
};

}  // namespace corvane::test
