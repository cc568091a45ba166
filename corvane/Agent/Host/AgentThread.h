#pragma once

#include <corvane/Platform/Descriptor.h>
#include <corvane/Platform/ForkMark.h>
#include <corvane/Platform/Mutex.h>

#include <poll.h>
#include <sys/types.h>

#include <atomic>
#include <functional>
#include <memory>
#include <thread>
#include <utility>
#include <vector>

namespace corvane {

class AgentLink;

/// The capability of code that runs on the agent thread: state that is the thread's own says so with
/// CORVANE_GUARDED_BY(agentThread), and functions with CORVANE_REQUIRES(agentThread). Internal.
class CORVANE_CAPABILITY("thread") AgentThreadRole {
  public:
    /// Stops the process with a message that names `operation` unless the calling code runs on the agent thread.
    void assertCurrent(const char* operation) const CORVANE_ASSERT_CAPABILITY(this);
};
inline constexpr AgentThreadRole agentThread;

/// The one thread of the process on which the library talks to transfer agents.
///
/// Started by the first link and asleep while nothing happens. It never waits for an agent, nor for a queue. When the
/// process exits it is stopped and joined; what is handed to it later, and in a child made by fork, is dropped.
/// Internal.
class AgentThread {
  public:
    /// The thread of this process; never destroyed. Throws `std::system_error` when there is no thread to be had.
    static AgentThread& shared();

    /// Runs `work` on the thread. Callable from any thread.
    void post(std::function<void()> work);

    /// Looks after a link until it is closed. Callable from any thread.
    void attach(std::shared_ptr<AgentLink> link);
    /// The same at once.
    void adopt(std::shared_ptr<AgentLink> link) CORVANE_REQUIRES(agentThread) { links_.push_back(std::move(link)); }

    /// Waits, in the background, for a process that was started, so that none stays as a zombie.
    void reap(pid_t process) CORVANE_REQUIRES(agentThread) { unreaped_.push_back(process); }

  private:
    AgentThread();
    void stop();
    void wakeUp() const noexcept;
    void run() CORVANE_REQUIRES(agentThread);
    /// Runs what was posted. False when the thread is to stop.
    bool takeInbox();
    /// Lets every link do what it can, and lets go of those that are closed.
    void proceed() CORVANE_REQUIRES(agentThread);
    void reapEnded() CORVANE_REQUIRES(agentThread);
    void wait() CORVANE_REQUIRES(agentThread);
    /// Fills in what is to be polled. Returns the time that the wait may take, in milliseconds; -1 for any.
    [[nodiscard]] int prepareWait() CORVANE_REQUIRES(agentThread);

    // For the exit handler. A child may be forked off while shared() makes the thread; its handler would wait there for
    // a thread that only the parent has.
    static std::atomic<AgentThread*> instance_;

    const ForkMark made_;
    Descriptor wakeUp_;
    std::thread thread_;

    Mutex mutex_;  // held for a few moves only
    std::vector<std::function<void()>> inbox_ CORVANE_GUARDED_BY(mutex_);
    bool stopping_ CORVANE_GUARDED_BY(mutex_) = false;

    std::vector<std::shared_ptr<AgentLink>> links_ CORVANE_GUARDED_BY(agentThread);
    std::vector<pollfd> polled_ CORVANE_GUARDED_BY(agentThread);
    std::vector<pid_t> unreaped_ CORVANE_GUARDED_BY(agentThread);
};

}  // namespace corvane
