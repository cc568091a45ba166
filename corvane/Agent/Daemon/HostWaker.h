#pragma once

#include <corvane/Agent/Daemon/AgentProcess.h>
#include <corvane/Agent/Daemon/TaskBook.h>

#include <chrono>
#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace corvane::transferd {

/// Runs the commands of owners that have completions waiting and no host to tell them to: once, until one has
/// connected.
class HostWaker {
  public:
    using Clock = std::chrono::steady_clock;
    /// Runs a program with its arguments; nobody waits for it.
    using Run = std::function<void(const std::vector<std::string>& command)>;
    /// Whether completions of an owner that nobody is there for have to wait for nothing more.
    using IsComplete = std::function<bool(const TaskBook::Owner&)>;

    explicit HostWaker(Run run) : run_(std::move(run)) {}

    /// Wakes whose time has come. A host that has started the agent, or lost it, is about to connect, so nobody is
    /// woken before there was somebody to wake for a while.
    void proceed(TaskBook& book, const IsComplete& isComplete, Clock::time_point now);
    /// When somebody is to be woken; nothing when nobody is.
    [[nodiscard]] std::optional<Clock::time_point> due() const { return wakesFrom_; }

  private:
    const Run run_;
    std::optional<Clock::time_point> wakesFrom_;
};

}  // namespace corvane::transferd
