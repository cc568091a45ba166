#include <corvane/Testing/ManualQueue.h>

#include <utility>

namespace corvane::test {

ManualQueue::ManualQueue() {
    MainQueue::setExecutor([tasks = tasks_](std::function<void()> task) {
        const std::lock_guard lock(tasks->mutex);
        tasks->waiting.push_back(std::move(task));
    });
}

ManualQueue::~ManualQueue() {
    MainQueue::setExecutor(nullptr);
}

std::size_t ManualQueue::waiting() const {
    const std::lock_guard lock(tasks_->mutex);
    return tasks_->waiting.size();
}

std::size_t ManualQueue::run() {
    std::vector<std::function<void()>> taken;
    {
        const std::lock_guard lock(tasks_->mutex);
        taken.swap(tasks_->waiting);
    }
    for (const auto& task : taken) task();
    return taken.size();
}

}  // namespace corvane::test
