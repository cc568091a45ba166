#pragma once

#include <corvane/Agent/Host/BackgroundTransferTask.h>
#include <corvane/Platform/Mutex.h>

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <unordered_map>
#include <vector>

namespace corvane {

/// The tasks of a background session: those that are not completed, and those whose completion the agent has still to
/// forget, so that what it says of them meanwhile is known to be old. Where a task is in its life the task itself says.
/// Internal; callable from any thread.
class TaskTable {
  public:
    using Task = BackgroundTransferTask;
    using Tasks = std::vector<std::shared_ptr<Task>>;

    /// A number for the next task, which orders the listing.
    [[nodiscard]] std::int64_t nextIdentifier();
    /// Keeps a task. False once the table is closed: the task is then nobody's.
    bool insert(const std::shared_ptr<Task>& task);
    /// The task of a token, completed or not, until it is removed; nullptr for any other.
    [[nodiscard]] std::shared_ptr<Task> find(const std::string& token) const;
    /// Lets go of a task of which nothing more will be heard.
    void remove(const std::string& token);
    /// Completes the tasks that are not completed yet, and lets go of them. What was told is kept to be looked up.
    void close();

    /// The tasks that are not completed, in the order of their identifiers.
    [[nodiscard]] Tasks open() const;
    /// The same for whoever asks the session.
    [[nodiscard]] std::vector<std::shared_ptr<TransferTask>> listing() const;
    /// Whether the agent has tasks whose end it has not told.
    [[nodiscard]] bool isAgentAwaited() const;
    /// The tokens of the tasks whose end was told and that are not removed.
    [[nodiscard]] std::vector<std::string> completedTokens() const;

  private:
    mutable Mutex mutex_;
    std::map<std::int64_t, std::shared_ptr<Task>> tasks_ CORVANE_GUARDED_BY(mutex_);
    std::unordered_map<std::string, std::int64_t> identifiers_ CORVANE_GUARDED_BY(mutex_);  // by token
    std::int64_t lastIdentifier_ CORVANE_GUARDED_BY(mutex_) = 0;
    bool closed_ CORVANE_GUARDED_BY(mutex_) = false;
};

}  // namespace corvane
