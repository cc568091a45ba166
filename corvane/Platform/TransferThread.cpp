#include <corvane/Platform/TransferThread.h>

#include <corvane/Platform/Log.h>
#include <corvane/Platform/Thread.h>
#include <corvane/Platform/TransferScheduler.h>

#include <unistd.h>

#include <cstdlib>
#include <mutex>
#include <set>
#include <thread>
#include <utility>

namespace corvane {

namespace {

using Ticket = TransferThread::Ticket;

class Engine {
  public:
    // Never destroyed: the exit handler stops the thread, and what it held is left to the system.
    static Engine& shared() {
        static auto& instance = *new Engine;
        return instance;
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

    const pid_t process_ = getpid();
    TransferScheduler scheduler_;  // the thread's own, but for waking it up
    std::thread thread_;

    std::mutex mutex_;  // guards these; held for a few moves only
    Ticket lastTicket_ = 0;
    std::vector<Arrived> arrived_;
    std::set<Ticket> cancelled_;
    bool stopping_ = false;
};

Engine::Engine() {
    SignalsBlocked blocked;
    thread_ = std::thread([this] {
        prepareThread("com.veskar.corvane.transfers", true);
        run();
    });
    std::atexit([] { shared().stop(); });
}

void Engine::stop() {
    if (getpid() != process_) return;  // a child made by fork has no such thread
    {
        std::lock_guard lock(mutex_);
        stopping_ = true;
    }
    scheduler_.wakeUp();
    thread_.join();
}

Ticket Engine::start(HTTPTransfer transfer) {
    Ticket ticket = 0;
    {
        std::lock_guard lock(mutex_);
        ticket = ++lastTicket_;
        if (!stopping_) arrived_.push_back({ticket, std::move(transfer)});
    }
    scheduler_.wakeUp();
    return ticket;
}

void Engine::cancel(const std::vector<Ticket>& tickets) {
    if (getpid() != process_) return;  // as for stop(); the transfers are the parent's
    {
        std::lock_guard lock(mutex_);
        if (stopping_) return;
        cancelled_.insert(tickets.begin(), tickets.end());
    }
    scheduler_.wakeUp();
}

void Engine::run() {
    while (takeInbox()) {
        scheduler_.perform();
        scheduler_.wait({}, scheduler_.millisecondsToDeadline());
    }
}

bool Engine::takeInbox() {
    std::vector<Arrived> arrived;
    std::set<Ticket> cancelled;
    {
        std::lock_guard lock(mutex_);
        if (stopping_) return false;
        arrived.swap(arrived_);
        cancelled.swap(cancelled_);
    }
    for (auto& one : arrived) scheduler_.start(one.ticket, std::move(one.transfer));
    if (!cancelled.empty()) scheduler_.cancel(cancelled);
    return true;
}

}  // namespace

TransferThread::Ticket TransferThread::start(HTTPTransfer transfer) {
    Engine* engine = nullptr;
    try {
        engine = &Engine::shared();
    } catch (...) {
        try {
            transfer.didComplete(AnyError::current(), std::nullopt);
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
