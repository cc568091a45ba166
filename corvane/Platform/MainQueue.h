#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Task.h>

#include <functional>

namespace corvane {

/// The host's main queue, on which completions of background wake-ups run.
///
/// A host with an event loop installs an executor that runs a task on it. Without one the library
/// keeps a serial queue of its own for the purpose. Both functions may be called from any thread.
class CORVANE_EXPORT MainQueue {
  public:
    /// Runs the given function later, on the host's main thread, in the order of the calls. It must
    /// not run it inside the call. Called from any library thread.
    using Executor = std::function<void(std::function<void()>)>;

    /// Installs the host's executor; an empty one brings back the library's own queue. An executor
    /// that throws has its error logged and the task runs on the library's own queue.
    static void setExecutor(Executor executor);

    static void async(Task task);
};

}  // namespace corvane
