#pragma once

#include <corvane/Platform/Log.h>

#include <condition_variable>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

namespace corvane::test {

/// Takes the library's log while it lives, at every level, so that a test can look at what was written. Nothing is
/// printed meanwhile; the destructor brings the logger back, at the level of errors. One at a time in a process. All
/// operations may be called from any thread.
///
///     CapturedLog log;
///     ...
///     EXPECT_EQ(log.count("without a completion"), 0);
class CapturedLog {
  public:
    /// One message, as `Log::Sink` gets it.
    struct Line {
        LogLevel level;
        std::string message;
    };

    CapturedLog();
    CapturedLog(const CapturedLog&) = delete;
    CapturedLog& operator=(const CapturedLog&) = delete;
    ~CapturedLog();

    /// What was written so far, in order.
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
