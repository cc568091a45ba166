#include <corvane/Agent/Host/TaskTable.h>

#include <algorithm>
#include <utility>

namespace corvane {

using Stage = BackgroundTransferTask::Stage;

std::int64_t TaskTable::nextIdentifier() {
    Lock lock(mutex_);
    return ++lastIdentifier_;
}

bool TaskTable::insert(const std::shared_ptr<Task>& task) {
    Lock lock(mutex_);
    if (closed_) return false;
    identifiers_.emplace(task->token(), task->identifier());
    tasks_.emplace(task->identifier(), task);
    return true;
}

std::shared_ptr<BackgroundTransferTask> TaskTable::find(const std::string& token) const {
    Lock lock(mutex_);
    const auto found = identifiers_.find(token);
    return found == identifiers_.end() ? nullptr : tasks_.at(found->second);
}

void TaskTable::remove(const std::string& token) {
    std::shared_ptr<Task> removed;  // let go of outside the lock
    Lock lock(mutex_);
    const auto found = identifiers_.find(token);
    if (found == identifiers_.end()) return;
    const auto task = tasks_.find(found->second);
    removed = std::move(task->second);
    tasks_.erase(task);
    identifiers_.erase(found);
}

void TaskTable::close() {
    Tasks dropped;
    Lock lock(mutex_);
    closed_ = true;
    for (auto task = tasks_.begin(); task != tasks_.end();) {
        if (!task->second->advanceTo(Stage::completed)) {
            ++task;
            continue;
        }
        identifiers_.erase(task->second->token());
        dropped.push_back(std::move(task->second));
        task = tasks_.erase(task);
    }
}

TaskTable::Tasks TaskTable::open() const {
    Lock lock(mutex_);
    Tasks open;
    open.reserve(tasks_.size());
    for (const auto& [identifier, task] : tasks_) {
        if (task->stage() != Stage::completed) open.push_back(task);
    }
    return open;
}

std::vector<std::shared_ptr<TransferTask>> TaskTable::listing() const {
    const Tasks listed = open();
    return {listed.begin(), listed.end()};
}

bool TaskTable::isAgentAwaited() const {
    Lock lock(mutex_);
    return std::any_of(tasks_.begin(), tasks_.end(), [](const auto& one) { return one.second->isWithAgent(); });
}

std::vector<std::string> TaskTable::completedTokens() const {
    Lock lock(mutex_);
    std::vector<std::string> tokens;
    for (const auto& [identifier, task] : tasks_) {
        if (task->stage() == Stage::completed) tokens.push_back(task->token());
    }
    return tokens;
}

}  // namespace corvane
