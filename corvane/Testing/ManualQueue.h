#pragma once

#include <corvane/Platform/MainQueue.h>

#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>
#include <vector>

namespace corvane::test {

/// A main queue whose tasks run when the test says so, on the test's thread: what an event loop would do. One at a time
/// in a process; the destructor brings back the library's own queue, and drops what has not run. All operations may be
/// called from any thread.
///
///     ManualQueue queue;
///     uploads->setDeliveryObserver([&](const DeliveryUpdate&) { ... });   // told on the main queue
///     ...
///     queue.run();
class ManualQueue {
  public:
    ManualQueue();
    ManualQueue(const ManualQueue&) = delete;
    ManualQueue& operator=(const ManualQueue&) = delete;
    ~ManualQueue();

    /// How many tasks wait.
    [[nodiscard]] std::size_t waiting() const;
    /// Runs the tasks that wait, in order, and not those that come meanwhile. Returns how many that were.
    std::size_t run();

  private:
    struct Tasks {
        mutable std::mutex mutex;
        std::vector<std::function<void()>> waiting;  // guarded by the mutex
    };
    const std::shared_ptr<Tasks> tasks_ = std::make_shared<Tasks>();  // shared with calls that are under way at the end
};

}  // namespace corvane::test
