#include <corvane/Transfer/TransferScheduler.h>

#include <corvane/Platform/HostCall.h>
#include <corvane/Signing/OpenSSLUse.h>

#include <curl/curl.h>
#include <openssl/crypto.h>
#include <poll.h>
#include <sys/eventfd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <limits>
#include <new>
#include <utility>

namespace corvane {

namespace {

// A wait that the system refuses (no memory, a lowered limit of descriptors) must not become a spin.
void rest(int milliseconds) {
    constexpr int longest = 50;
    poll(nullptr, 0, std::clamp(milliseconds, 0, longest));
}

}  // namespace

void TransferScheduler::MultiDeleter::operator()(void* multi) const noexcept {
    curl_multi_cleanup(multi);
}

TransferScheduler::TransferScheduler() : wakeUp_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    if (!wakeUp_) throw SystemError("make an event descriptor", errno);
    // Whatever registers handlers of its own for the exit comes first, so that those of the scheduler's owner run
    // before them.
    OpenSSLUse::initialize();
    if (curl_global_init(CURL_GLOBAL_DEFAULT) != CURLE_OK) throw std::bad_alloc();
    OPENSSL_thread_stop();  // this thread may end after OpenSSL's exit handler, which leaves it nothing to free with
    multi_.reset(curl_multi_init());
    if (!multi_) throw std::bad_alloc();
}

// A handle must not outlive the multi handle that it was added to.
TransferScheduler::~TransferScheduler() {
    for (const auto& one : running_) curl_multi_remove_handle(multi_.get(), one.curl->handle());
}

bool TransferScheduler::start(Ticket ticket, HTTPTransfer transfer) {
    try {
        auto curl = std::make_unique<CurlTransfer>(transfer);
        makeRoom();
        if (curl_multi_add_handle(multi_.get(), curl->handle()) != CURLM_OK) throw std::bad_alloc();
        running_.push_back({ticket, std::move(transfer), std::move(curl)});
        return true;
    } catch (...) {
        reportFailure(transfer);
        return false;
    }
}

bool TransferScheduler::isRunning(Ticket ticket) const {
    return std::any_of(running_.begin(), running_.end(), [ticket](const Running& one) { return one.ticket == ticket; });
}

void TransferScheduler::reportFailure(const HTTPTransfer& transfer) noexcept {
    callHost("transfer completion", [&] { transfer.didComplete({AnyError::current(), std::nullopt}); });
}

void TransferScheduler::reportCancelled(const HTTPTransfer& transfer) noexcept {
    callHost("transfer completion", [&] { transfer.didComplete(cancelledOutcome()); });
}

void TransferScheduler::perform() {
    int stillRunning = 0;
    curl_multi_perform(multi_.get(), &stillRunning);
    checkProgress();
    finishEnded();
}

void TransferScheduler::wait(std::span<pollfd> others, int milliseconds) {
    std::vector<curl_waitfd> extra;
    extra.reserve(others.size() + 1);
    for (const auto& one : others) {
        const short events = static_cast<short>((one.events & POLLIN ? CURL_WAIT_POLLIN : 0) |
                                                (one.events & POLLOUT ? CURL_WAIT_POLLOUT : 0));
        extra.push_back({one.fd, events, 0});
    }
    extra.push_back({wakeUp_.get(), CURL_WAIT_POLLIN, 0});
    const auto count = static_cast<unsigned>(extra.size());
    if (curl_multi_poll(multi_.get(), extra.data(), count, milliseconds, nullptr) != CURLM_OK) rest(milliseconds);
    eventfd_t ignored = 0;
    eventfd_read(wakeUp_.get(), &ignored);
    for (std::size_t i = 0; i < others.size(); ++i) {
        const short ready = extra[i].revents;
        others[i].revents =
            static_cast<short>((ready & CURL_WAIT_POLLIN ? POLLIN : 0) | (ready & CURL_WAIT_POLLOUT ? POLLOUT : 0));
    }
}

void TransferScheduler::wakeUp() noexcept {
    eventfd_write(wakeUp_.get(), 1);
}

void TransferScheduler::cancel(const std::set<Ticket>& tickets) {
    const auto isMeant = [&tickets](const Running& one) { return tickets.contains(one.ticket); };
    for (auto found = running_.end();
         (found = std::find_if(running_.begin(), running_.end(), isMeant)) != running_.end();) {
        const CurlTransfer::UnsentIsDropped dropped;
        const Running ended = takeOut(found);
        finish(ended, [] { return cancelledOutcome().error; });
    }
}

// So that nothing can fail once curl has the handle.
void TransferScheduler::makeRoom() {
    constexpr std::size_t least = 8;
    if (running_.size() == running_.capacity()) running_.reserve(std::max(least, 2 * running_.size()));
}

// Takes a running transfer away from curl.
TransferScheduler::Running TransferScheduler::takeOut(std::vector<Running>::iterator position) {
    Running ended = std::move(*position);
    running_.erase(position);
    curl_multi_remove_handle(multi_.get(), ended.curl->handle());
    return ended;
}

void TransferScheduler::finish(const Running& ended, const auto& error) noexcept {
    try {
        ended.transfer.didComplete({error(), ended.curl->response()});
    } catch (...) {
        reportFailure(ended.transfer);
    }
}

void TransferScheduler::finishEnded() {
    int remaining = 0;
    while (const CURLMsg* message = curl_multi_info_read(multi_.get(), &remaining)) {
        if (message->msg != CURLMSG_DONE) continue;
        const CURLcode code = message->data.result;  // the message goes with the handle
        const auto found = std::find_if(running_.begin(), running_.end(), [message](const Running& one) {
            return one.curl->handle() == message->easy_handle;
        });
        if (found == running_.end()) continue;
        const Running ended = takeOut(found);
        finish(ended, [&] { return ended.curl->error(code); });
    }
}

void TransferScheduler::checkProgress() {
    const auto now = Clock::now();
    for (auto& one : running_) one.curl->update(now);
    const auto isLate = [now](const Running& one) { return one.curl->deadline() <= now; };
    for (auto late = running_.end();
         (late = std::find_if(running_.begin(), running_.end(), isLate)) != running_.end();) {
        const Running ended = takeOut(late);
        finish(ended, [&] { return ended.curl->timeoutError(); });
    }
}

int TransferScheduler::millisecondsToDeadline() const {
    auto earliest = Clock::time_point::max();
    for (const auto& one : running_) earliest = std::min(earliest, one.curl->deadline());
    if (earliest == Clock::time_point::max()) return std::numeric_limits<int>::max();
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(earliest - Clock::now()).count();
    return static_cast<int>(std::clamp<std::int64_t>(left, 0, std::numeric_limits<int>::max()));
}

}  // namespace corvane
