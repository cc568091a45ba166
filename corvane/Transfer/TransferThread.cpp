#include <corvane/Transfer/TransferThread.h>

#include <corvane/Platform/ForkMark.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/Thread.h>
#include <corvane/Signing/OpenSSLUse.h>
#include <corvane/Transfer/TransferQueue.h>

#include <atomic>
#include <chrono>
#include <cstdlib>
#include <exception>
#include <set>
#include <thread>
#include <utility>

namespace corvane {

namespace {

using Ticket = TransferThread::Ticket;

constexpr auto betweenAttempts = std::chrono::milliseconds(50);

class Engine {
  public:
    // Never destroyed: the exit handler stops the thread, and what it held is left to the system.
    static Engine& shared() {
        if (Engine* made = instance_.load()) return *made;
        const OpenSSLUse use;  // libcurl sets up what is built on it, which crashes once OpenSSL has been taken down
        static auto& engine = *new Engine;
        return engine;
    }

    Ticket start(HTTPTransfer transfer);
    void cancel(const std::vector<Ticket>& tickets);

  private:
    struct Arrived {
        Ticket ticket;
        HTTPTransfer transfer;
    };

    Engine();
    void stop();

    void run();
    bool takeInbox();

    // For the exit handler. A child may be forked off while shared() makes the engine; its handler would wait there for
    // a thread that only the parent has.
    static inline std::atomic<Engine*> instance_ = nullptr;

    const ForkMark made_;
    TransferQueue queue_;  // the thread's own, but for waking it up
    std::thread thread_;

    Mutex mutex_;  // held for a few moves only
    Ticket lastTicket_ CORVANE_GUARDED_BY(mutex_) = 0;
    std::vector<Arrived> arrived_ CORVANE_GUARDED_BY(mutex_);
    std::set<Ticket> cancelled_ CORVANE_GUARDED_BY(mutex_);
    bool stopping_ CORVANE_GUARDED_BY(mutex_) = false;
};

Engine::Engine() {
    SignalsBlocked blocked;
    thread_ = std::thread([this] {
        prepareThread("com.veskar.corvane.transfers", true);
        run();
    });
    instance_ = this;
    std::atexit([] { instance_.load()->stop(); });
}

void Engine::stop() {
    if (made_.isInChild()) return;  // it has no such thread
    {
        Lock lock(mutex_);
        stopping_ = true;
    }
    queue_.wakeUp();
    thread_.join();
}

Ticket Engine::start(HTTPTransfer transfer) {
    if (made_.isInChild()) return 0;  // a thread of the parent may have held the lock
    Ticket ticket = 0;
    {
        Lock lock(mutex_);
        ticket = ++lastTicket_;
        if (!stopping_) arrived_.push_back({ticket, std::move(transfer)});
        if (arrived_.size() > 1) return ticket;  // it has been woken for the first
    }
    queue_.wakeUp();
    return ticket;
}

void Engine::cancel(const std::vector<Ticket>& tickets) {
    if (made_.isInChild()) return;  // as for stop(); the transfers are the parent's
    {
        Lock lock(mutex_);
        if (stopping_) return;
        cancelled_.insert(tickets.begin(), tickets.end());
    }
    queue_.wakeUp();
}

void Engine::run() {
    while (takeInbox()) {
        try {
            queue_.perform();
            queue_.wait();
        } catch (const std::exception&) {  // no memory: it is tried again, and not in a spin
            std::this_thread::sleep_for(betweenAttempts);
        }
    }
}

bool Engine::takeInbox() {
    std::vector<Arrived> arrived;
    std::set<Ticket> cancelled;
    {
        Lock lock(mutex_);
        if (stopping_) return false;
        arrived.swap(arrived_);
        cancelled.swap(cancelled_);
    }
    for (auto& one : arrived) queue_.start(one.ticket, std::move(one.transfer));
    if (!cancelled.empty()) queue_.cancel(cancelled);
    return true;
}

}  // namespace

TransferThread::Ticket TransferThread::start(HTTPTransfer transfer) {
    Engine* engine = nullptr;
    try {
        engine = &Engine::shared();
    } catch (...) {
        try {
            transfer.didComplete({AnyError::current(), std::nullopt});
        } catch (...) {
            Log::shared().error("Transfer could not be reported, error=%{public}@", AnyError::current().what());
        }
        return 0;
    }
    return engine->start(std::move(transfer));
}

void TransferThread::cancel(const std::vector<Ticket>& tickets) {
    if (!tickets.empty()) Engine::shared().cancel(tickets);
}

}  // namespace corvane
