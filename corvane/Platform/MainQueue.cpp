#include <corvane/Platform/MainQueue.h>

#include <corvane/Platform/Error.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/SerialQueue.h>

#include <memory>
#include <utility>

namespace corvane {

namespace {
struct Registry {
    Mutex mutex;
    std::shared_ptr<const MainQueue::Executor> executor CORVANE_GUARDED_BY(mutex);
    SerialQueue queue{"com.veskar.corvane.main"};
};

Registry& registry() {
    static auto& instance = *new Registry;  // never destroyed: tasks may arrive while the process exits
    return instance;
}

// A std::function wants a copyable callable that does not throw into the host's loop.
std::function<void()> shareable(std::shared_ptr<Task> task) {
    return [task = std::move(task)] {
        try {
            (*task)();
        } catch (...) {
            Log::shared().error("Task failed, queue=%{public}@, error=%{public}@", "main", AnyError::current().what());
        }
    };
}
}  // namespace

void MainQueue::setExecutor(Executor executor) {
    auto shared = executor ? std::make_shared<const Executor>(std::move(executor)) : nullptr;
    const Lock lock(registry().mutex);
    registry().executor.swap(shared);  // the old one goes behind the lock
}

void MainQueue::async(Task task) {
    std::shared_ptr<const Executor> executor;
    {
        const Lock lock(registry().mutex);
        executor = registry().executor;
    }
    if (!executor) {
        registry().queue.async(std::move(task));
        return;
    }
    auto function = shareable(std::make_shared<Task>(std::move(task)));
    try {
        (*executor)(function);
    } catch (...) {
        Log::shared().error("Main queue executor failed, error=%{public}@", AnyError::current().what());
        registry().queue.async(std::move(function));
    }
}

}  // namespace corvane
