#include <corvane/Platform/TransferThread.h>

#include <corvane/Platform/CurlTransfer.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/OpenSSLUse.h>
#include <corvane/Platform/Thread.h>
#include <corvane/Platform/TransferError.h>

#include <curl/curl.h>
#include <openssl/crypto.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <deque>
#include <limits>
#include <map>
#include <memory>
#include <mutex>
#include <new>
#include <set>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace corvane {

namespace {

using Clock = CurlTransfer::Clock;
using Ticket = TransferThread::Ticket;

void report(const HTTPTransfer& transfer, std::optional<AnyError> error, std::optional<TransferResponse> response) {
    try {
        transfer.didComplete(std::move(error), std::move(response));
    } catch (...) {
        Log::shared().error("Transfer could not be reported, error=%{public}@", AnyError::current().what());
    }
}

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
    struct Waiting {
        Ticket ticket;
        HTTPTransfer transfer;
    };
    struct Running {
        Ticket ticket;
        std::string host;
        HTTPTransfer transfer;
        std::unique_ptr<CurlTransfer> curl;
    };
    struct Host {
        int running = 0;
        std::deque<Waiting> waiting;
    };
    struct MultiDeleter {
        void operator()(CURLM* multi) const noexcept { curl_multi_cleanup(multi); }
    };

    Engine();
    void stop();

    void run();
    bool takeInbox();
    void accept(Waiting arrived);
    void drop(const std::set<Ticket>& tickets);
    void startWaiting(const std::string& host);
    void startOne(const std::string& host, Waiting next);
    void finishEnded();
    void checkProgress();
    Running takeOut(std::vector<Running>::iterator position);
    [[nodiscard]] int millisecondsToDeadline() const;

    const pid_t process_ = getpid();
    std::unique_ptr<CURLM, MultiDeleter> multi_;
    std::thread thread_;

    std::mutex mutex_;  // guards these; held for a few moves only
    Ticket lastTicket_ = 0;
    std::vector<Waiting> arrived_;
    std::set<Ticket> cancelled_;
    bool stopping_ = false;

    // The thread's own.
    std::map<std::string, Host> hosts_;
    std::vector<Running> running_;
};

Engine::Engine() {
    // Whatever registers handlers of its own for the exit comes first, so that ours runs before them.
    OpenSSLUse::initialize();
    if (curl_global_init(CURL_GLOBAL_DEFAULT) != CURLE_OK) throw std::bad_alloc();
    OPENSSL_thread_stop();  // this thread may end after OpenSSL's exit handler, which leaves it nothing to free with
    multi_.reset(curl_multi_init());
    if (!multi_) throw std::bad_alloc();
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
    curl_multi_wakeup(multi_.get());
    thread_.join();
}

Ticket Engine::start(HTTPTransfer transfer) {
    Ticket ticket = 0;
    {
        std::lock_guard lock(mutex_);
        ticket = ++lastTicket_;
        if (!stopping_) arrived_.push_back({ticket, std::move(transfer)});
    }
    curl_multi_wakeup(multi_.get());
    return ticket;
}

void Engine::cancel(const std::vector<Ticket>& tickets) {
    if (getpid() != process_) return;  // as for stop(); the transfers are the parent's
    {
        std::lock_guard lock(mutex_);
        if (stopping_) return;
        cancelled_.insert(tickets.begin(), tickets.end());
    }
    curl_multi_wakeup(multi_.get());
}

void Engine::run() {
    while (takeInbox()) {
        int stillRunning = 0;
        curl_multi_perform(multi_.get(), &stillRunning);
        checkProgress();
        finishEnded();
        curl_multi_poll(multi_.get(), nullptr, 0, millisecondsToDeadline(), nullptr);
    }
}

bool Engine::takeInbox() {
    std::vector<Waiting> arrived;
    std::set<Ticket> cancelled;
    {
        std::lock_guard lock(mutex_);
        if (stopping_) return false;
        arrived.swap(arrived_);
        cancelled.swap(cancelled_);
    }
    for (auto& one : arrived) accept(std::move(one));
    if (!cancelled.empty()) drop(cancelled);
    return true;
}

void Engine::accept(Waiting arrived) {
    try {
        const std::string host = CurlTransfer::hostKey(arrived.transfer);
        hosts_[host].waiting.push_back(std::move(arrived));
        startWaiting(host);
    } catch (...) {
        report(arrived.transfer, AnyError::current(), std::nullopt);
    }
}

// Those that wait go first, so that none of them gets the place of one that runs.
void Engine::drop(const std::set<Ticket>& tickets) {
    const auto dropped = [&tickets](const auto& one) { return tickets.contains(one.ticket); };
    for (auto& [name, host] : hosts_) std::erase_if(host.waiting, dropped);
    std::set<std::string> freed;
    for (auto found = running_.end();
         (found = std::find_if(running_.begin(), running_.end(), dropped)) != running_.end();) {
        freed.insert(takeOut(found).host);
    }
    for (const auto& host : freed) startWaiting(host);
    std::erase_if(hosts_, [](const auto& host) { return !host.second.running && host.second.waiting.empty(); });
}

void Engine::startWaiting(const std::string& name) {
    Host& host = hosts_[name];
    while (!host.waiting.empty() && host.running < host.waiting.front().transfer.limits.transfersPerHost) {
        Waiting next = std::move(host.waiting.front());
        host.waiting.pop_front();
        startOne(name, std::move(next));
    }
    if (!host.running && host.waiting.empty()) hosts_.erase(name);
}

void Engine::startOne(const std::string& host, Waiting next) {
    try {
        auto curl = std::make_unique<CurlTransfer>(next.transfer);
        if (curl_multi_add_handle(multi_.get(), curl->handle()) != CURLM_OK) throw std::bad_alloc();
        running_.push_back({next.ticket, host, std::move(next.transfer), std::move(curl)});
        ++hosts_[host].running;
    } catch (...) {
        report(next.transfer, AnyError::current(), std::nullopt);
    }
}

// Takes a running transfer away from curl; the caller looks after those that waited for its place.
Engine::Running Engine::takeOut(std::vector<Running>::iterator position) {
    Running ended = std::move(*position);
    running_.erase(position);
    curl_multi_remove_handle(multi_.get(), ended.curl->handle());
    --hosts_[ended.host].running;
    return ended;
}

void Engine::finishEnded() {
    int remaining = 0;
    while (const CURLMsg* message = curl_multi_info_read(multi_.get(), &remaining)) {
        if (message->msg != CURLMSG_DONE) continue;
        const CURLcode code = message->data.result;  // the message goes with the handle
        const auto found = std::find_if(running_.begin(), running_.end(), [message](const Running& one) {
            return one.curl->handle() == message->easy_handle;
        });
        if (found == running_.end()) continue;
        const Running ended = takeOut(found);
        report(ended.transfer, ended.curl->error(code), ended.curl->response());
        startWaiting(ended.host);
    }
}

void Engine::checkProgress() {
    const auto now = Clock::now();
    std::vector<Ticket> late;
    for (auto& one : running_) {
        one.curl->update(now);
        if (one.curl->deadline() <= now) late.push_back(one.ticket);
    }
    for (const Ticket ticket : late) {
        const Running ended = takeOut(std::find_if(running_.begin(), running_.end(),
                                                   [ticket](const Running& one) { return one.ticket == ticket; }));
        report(ended.transfer, ended.curl->timeoutError(), ended.curl->response());
        startWaiting(ended.host);
    }
}

int Engine::millisecondsToDeadline() const {
    auto earliest = Clock::time_point::max();
    for (const auto& one : running_) earliest = std::min(earliest, one.curl->deadline());
    if (earliest == Clock::time_point::max()) return std::numeric_limits<int>::max();
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(earliest - Clock::now()).count();
    return static_cast<int>(std::clamp<std::int64_t>(left, 0, std::numeric_limits<int>::max()));
}

}  // namespace

TransferThread::Ticket TransferThread::start(HTTPTransfer transfer) {
    Engine* engine = nullptr;
    try {
        engine = &Engine::shared();
    } catch (...) {
        report(transfer, AnyError::current(), std::nullopt);
        return 0;
    }
    return engine->start(std::move(transfer));
}

void TransferThread::cancel(const std::vector<Ticket>& tickets) {
    if (!tickets.empty()) Engine::shared().cancel(tickets);
}

}  // namespace corvane
