#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Error.h>

#include <atomic>
#include <concepts>
#include <cstdint>
#include <functional>
#include <initializer_list>
#include <memory>
#include <string>
#include <string_view>

namespace corvane {

enum class LogLevel {
    debug,     ///< every event and signature: for developers watching
    default_,  ///< progress
    error,     ///< failures
};

/// Text of several lines that a log message prints as they are.
struct LogLines {
    std::string_view text;
};

/// One value that a log message prints: text or an integer. Holds a view, good for the length of
/// the call.
///
/// Control characters and bytes that are not UTF-8 are printed as "\x1b", "\n" and the like: what a
/// server or a damaged file says must neither forge a line nor steer a terminal.
class LogArgument {
  public:
    LogArgument(LogLines lines) : text_(lines.text), keepsLines_(true) {}  // NOLINT(google-explicit-constructor)
    LogArgument(std::string_view text) : text_(text) {}                    // NOLINT(google-explicit-constructor)
    LogArgument(const std::string& text) : text_(text) {}                  // NOLINT(google-explicit-constructor)
    LogArgument(const char* text) : text_(text) {}                         // NOLINT(google-explicit-constructor)
    template <std::integral I>
    CORVANE_LOCAL LogArgument(I number) : number_(static_cast<std::int64_t>(number)), isNumber_(true) {}  // NOLINT

    void appendTo(std::string& out) const;

  private:
    std::string_view text_;
    std::int64_t number_ = 0;
    bool isNumber_ = false;
    bool keepsLines_ = false;
};

/// The library's log: subsystem "com.veskar.corvane", category "Analytics".
///
/// Messages go through the spdlog logger named by the subsystem to standard error, unless the host
/// attaches a sink of its own. A host that has registered an spdlog logger of that name before the
/// first message keeps that one. The active level is `error` until the host sets another one: a
/// message below it costs a load and a branch. All operations may be called from any thread.
///
/// A format is fixed text with placeholders, taken in order: "%{public}@" and "%@" print text,
/// "%ld" and "%d" numbers. Text of "%@" is the host's data: `setHidesPrivateArguments` prints it as
/// "<private>".
class CORVANE_EXPORT Log {
  public:
    CORVANE_LOCAL static constexpr std::string_view subsystem = "com.veskar.corvane";
    CORVANE_LOCAL static constexpr std::string_view category = "Analytics";

    /// Receives a finished message, UTF-8, without level, time or line break at its end. Called on any library thread,
    /// on several at once; must not call back into the library and wait. What it throws is dropped.
    using Sink = std::function<void(LogLevel, std::string_view message)>;

    /// The one log of the process; never destroyed.
    static Log& shared();

    [[nodiscard]] bool isEnabled(LogLevel level) const noexcept {
        return level >= level_.load(std::memory_order_relaxed);
    }
    /// Sets the lowest level that is written.
    void setLevel(LogLevel level) noexcept { level_.store(level, std::memory_order_relaxed); }
    /// Sends messages to `sink` in place of the logger; an empty sink brings the logger back.
    void setSink(Sink sink);
    void setHidesPrivateArguments(bool hides) noexcept { hidesPrivate_.store(hides, std::memory_order_relaxed); }

    template <class... Arguments>
    CORVANE_LOCAL void debug(const char* format, const Arguments&... arguments) noexcept {
        log(LogLevel::debug, format, arguments...);
    }
    template <class... Arguments>
    CORVANE_LOCAL void default_(const char* format, const Arguments&... arguments) noexcept {
        log(LogLevel::default_, format, arguments...);
    }
    template <class... Arguments>
    CORVANE_LOCAL void error(const char* format, const Arguments&... arguments) noexcept {
        log(LogLevel::error, format, arguments...);
    }

  private:
    struct Output;

    Log();
    ~Log() = delete;

    template <class... Arguments>
    CORVANE_LOCAL void log(LogLevel level, const char* format, const Arguments&... arguments) noexcept {
        if (isEnabled(level)) write(level, format, {LogArgument(arguments)...});
    }
    void write(LogLevel level, std::string_view format, std::initializer_list<LogArgument> arguments) noexcept;

    std::atomic<LogLevel> level_ = LogLevel::error;
    std::atomic<bool> hidesPrivate_ = false;
    Output* output_;
};

}  // namespace corvane
