#pragma once

#include <corvane/Platform/Descriptor.h>
#include <corvane/Platform/ForkMark.h>

#include <poll.h>
#include <sys/types.h>

#include <atomic>
#include <functional>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <thread>
#include <vector>

namespace corvane {

class AgentLink;

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

    /// Waits, in the background, for a process that was started, so that none stays as a zombie. On the thread.
    void reap(pid_t process) { unreaped_.push_back(process); }

    /// The tokens of tasks that the agents are to forget, and have not said that they have. Of the whole process, so
    /// that a session that is opened while another one's acknowledgement is under way is not told again. On the thread.
    [[nodiscard]] std::set<std::string>& acknowledged() { return acknowledged_; }

  private:
    AgentThread();
    void stop();
    void wakeUp() const noexcept;
    void run();
    bool takeInbox();
    void reapEnded();
    void wait();
    int prepareWait();

    // For the exit handler. A child may be forked off while shared() makes the thread; its handler would wait there for
    // a thread that only the parent has.
    static std::atomic<AgentThread*> instance_;

    const ForkMark made_;
    Descriptor wakeUp_;
    std::thread thread_;

    std::mutex mutex_;  // guards these; held for a few moves only
    std::vector<std::function<void()>> inbox_;
    bool stopping_ = false;

    // The thread's own.
    std::vector<std::shared_ptr<AgentLink>> links_;
    std::vector<pollfd> polled_;
    std::vector<pid_t> unreaped_;
    std::set<std::string> acknowledged_;
};

}  // namespace corvane
