#include <corvane/Agent/Host/AgentThread.h>

#include <corvane/Agent/Host/AgentLink.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/HostCall.h>
#include <corvane/Platform/Require.h>
#include <corvane/Platform/Thread.h>
#include <corvane/Signing/OpenSSLUse.h>

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/wait.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <exception>
#include <limits>
#include <string>
#include <utility>

namespace corvane {

namespace {
thread_local bool isAgentThread = false;
}

void AgentThreadRole::assertCurrent(const char* operation) const {
    CORVANE_REQUIRE(isAgentThread, std::string(operation) + " must run on the agent thread");
}

constinit std::atomic<AgentThread*> AgentThread::instance_ = nullptr;

AgentThread& AgentThread::shared() {
    if (AgentThread* made = instance_.load()) return *made;
    static auto& instance = *new AgentThread;
    return instance;
}

AgentThread::AgentThread() : wakeUp_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    if (!wakeUp_) throw SystemError("make an event descriptor", errno);
    // Whatever registers handlers of its own for the exit comes first: transfers that the thread takes over begin on
    // it.
    OpenSSLUse::initialize();
    SignalsBlocked blocked;
    thread_ = std::thread([this] {
        prepareThread("com.veskar.corvane.agent-link", false);
        isAgentThread = true;
        agentThread.assertCurrent("AgentThread");
        run();
    });
    instance_ = this;
    std::atexit([] { instance_.load()->stop(); });
}

void AgentThread::stop() {
    if (made_.isInChild()) return;
    {
        Lock lock(mutex_);
        stopping_ = true;
    }
    wakeUp();
    thread_.join();
}

void AgentThread::wakeUp() const noexcept {
    eventfd_write(wakeUp_.get(), 1);
}

void AgentThread::post(std::function<void()> work) {
    if (made_.isInChild()) return;  // a thread of the parent may have held the lock
    {
        Lock lock(mutex_);
        if (stopping_) return;
        inbox_.push_back(std::move(work));
        if (inbox_.size() > 1) return;  // it has been woken for the first
    }
    wakeUp();
}

void AgentThread::attach(std::shared_ptr<AgentLink> link) {
    post([this, link = std::move(link)] {
        agentThread.assertCurrent("AgentThread::attach");
        adopt(link);
    });
}

void AgentThread::run() {
    bool goesOn = true;
    while (goesOn) {
        goesOn = takeInbox();
        proceed();
        reapEnded();
        if (goesOn) wait();
    }
    for (const auto& link : links_) {
        callHost("transfer agent link", [&] {
            agentThread.assertCurrent("AgentLink::endOfProcess");
            link->endOfProcess();
        });
    }
}

void AgentThread::proceed() {
    for (const auto& link : links_) {
        callHost("transfer agent link", [&] {
            agentThread.assertCurrent("AgentLink::proceed");
            link->proceed(AgentLink::Clock::now());
        });
    }
    std::erase_if(links_, [](const auto& link) {
        agentThread.assertCurrent("AgentLink::isClosed");
        return link->isClosed();
    });
}

// The last round, at the exit, still sends what was handed over: an acknowledgement spares the next run a report.
bool AgentThread::takeInbox() {
    std::vector<std::function<void()>> inbox;
    bool isLast = false;
    {
        Lock lock(mutex_);
        isLast = stopping_;
        inbox.swap(inbox_);
    }
    for (const auto& work : inbox) callHost("transfer agent link", work);
    return !isLast;
}

// By number, and never for "any child": the host's own children are the host's.
void AgentThread::reapEnded() {
    std::erase_if(unreaped_, [](pid_t process) {
        const pid_t ended = waitpid(process, nullptr, WNOHANG);
        return ended == process || (ended < 0 && errno == ECHILD);
    });
}

// Without memory for the descriptors there is still the wake-up to wait for, and the links are looked after again soon.
void AgentThread::wait() {
    constexpr int untilNextAttempt = 50;
    pollfd wakeUp{wakeUp_.get(), POLLIN, 0};
    try {
        const int milliseconds = prepareWait();
        poll(polled_.data(), polled_.size(), milliseconds);
        wakeUp = polled_.front();
    } catch (const std::exception&) {
        poll(&wakeUp, 1, untilNextAttempt);
    }
    if (wakeUp.revents != 0) {
        eventfd_t ignored = 0;
        eventfd_read(wakeUp_.get(), &ignored);
    }
}

int AgentThread::prepareWait() {
    constexpr int untilReaped = 5;
    polled_.assign(1, {wakeUp_.get(), POLLIN, 0});
    auto next = AgentLink::Clock::time_point::max();
    for (const auto& link : links_) {
        if (const auto wanted = link->polled(); wanted.fd >= 0) polled_.push_back(wanted);
        next = std::min(next, link->nextDeadline());
    }
    int milliseconds = -1;
    if (next != AgentLink::Clock::time_point::max()) {
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(next - AgentLink::Clock::now()).count();
        milliseconds = static_cast<int>(std::clamp<std::int64_t>(left, 0, std::numeric_limits<int>::max()));
    }
    if (unreaped_.empty()) return milliseconds;
    return milliseconds < 0 ? untilReaped : std::min(milliseconds, untilReaped);
}

}  // namespace corvane
