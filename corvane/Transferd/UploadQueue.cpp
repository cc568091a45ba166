#include <corvane/Transferd/UploadQueue.h>

#include <corvane/Platform/TransferError.h>

#include <algorithm>
#include <limits>
#include <utility>

namespace corvane::transferd {

namespace {

using namespace std::chrono_literals;

constexpr auto longestDelay = std::chrono::milliseconds(5min);

// The delay after so many failures in a row, the first being 1.
std::chrono::milliseconds delayAfter(int failures, std::chrono::milliseconds first) {
    auto delay = first;
    for (int i = 1; i < failures && delay < longestDelay; ++i) delay *= 2;
    return std::min(delay, longestDelay);
}

bool isUnreachable(const std::optional<AnyError>& error) {
    const auto* known = error ? error->as<TransferError>() : nullptr;
    return known && known->value() == TransferError::Code::unreachable;
}

}  // namespace

std::string UploadQueue::hostKey(const TransferRequest& request) {
    HTTPTransfer transfer;
    transfer.request.url = request.url;
    return CurlTransfer::hostKey(transfer);
}

bool UploadQueue::Host::mayStart(Clock::time_point now) const {
    if (waiting.empty() || now < pausedUntil) return false;
    return static_cast<int>(running.size()) < (failures > 0 ? 1 : waiting.front().perHost);
}

void UploadQueue::add(std::int64_t number, const std::string& host, int perHost) {
    hosts_[host].waiting.push_back({number, perHost});
}

void UploadQueue::remove(std::int64_t number) {
    for (auto host = hosts_.begin(); host != hosts_.end();) {
        const auto next = std::next(host);
        std::erase_if(host->second.waiting, [number](const Waiting& one) { return one.number == number; });
        if (host->second.running.erase(number) > 0) scheduler_.cancel({static_cast<std::uint64_t>(number)});
        settle(host);
        host = next;
    }
}

// A host with nothing to do is forgotten, with what is known of it.
void UploadQueue::settle(std::map<std::string, Host>::iterator host) {
    if (host->second.waiting.empty() && host->second.running.empty()) hosts_.erase(host);
}

void UploadQueue::proceed(Clock::time_point now) {
    for (auto& [name, host] : hosts_) {
        while (host.mayStart(now)) startOne(host);
    }
    scheduler_.perform();
    for (auto& ended : std::exchange(arrived_, {})) finished(std::move(ended), now);
    for (auto host = hosts_.begin(); host != hosts_.end();) settle(host++);
}

void UploadQueue::startOne(Host& host) {
    const Waiting next = host.waiting.front();
    host.waiting.pop_front();
    try {
        auto transfer = source_.transfer(next.number);
        if (!transfer) return;
        transfer->didSend = [this, number = next.number](std::int64_t total, std::int64_t expected) {
            progress_.push_back({number, total, expected});
        };
        transfer->didComplete = [this, number = next.number](std::optional<AnyError> error,
                                                             std::optional<TransferResponse> response) {
            arrived_.push_back({number, std::move(error), std::move(response)});
        };
        host.running.emplace(next.number, next);
        scheduler_.start(static_cast<std::uint64_t>(next.number), *std::move(transfer));
    } catch (...) {
        ended_.push_back({next.number, AnyError::current(), std::nullopt});
    }
}

void UploadQueue::finished(Ended ended, Clock::time_point now) {
    const auto found = std::find_if(hosts_.begin(), hosts_.end(),
                                    [&](const auto& host) { return host.second.running.contains(ended.number); });
    if (found == hosts_.end()) return;
    Host& host = found->second;
    const Waiting upload = host.running.extract(ended.number).mapped();
    if (!isUnreachable(ended.error)) {
        host.failures = 0;
        host.pausedUntil = Clock::time_point::min();
        ended_.push_back(std::move(ended));
        return;
    }
    if (now >= host.pausedUntil) {  // those that ran beside the first to fail say nothing new
        ++host.failures;
        host.pausedUntil = now + delayAfter(host.failures, retryDelay_);
    }
    host.waiting.push_front(upload);
    // One failure speaks for all: whoever has waited long enough does not wait for an attempt of its own.
    std::erase_if(host.waiting, [&](const Waiting& one) {
        const bool isOver = !source_.mayWait(one.number);
        if (isOver) ended_.push_back({one.number, ended.error, std::nullopt});
        return isOver;
    });
}

int UploadQueue::millisecondsToDeadline(Clock::time_point now) const {
    std::int64_t shortest = scheduler_.millisecondsToDeadline();
    if (!ended_.empty() || !arrived_.empty()) shortest = 0;
    for (const auto& [name, host] : hosts_) {
        if (host.mayStart(now)) shortest = 0;
        if (host.waiting.empty() || host.pausedUntil <= now) continue;
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(host.pausedUntil - now).count();
        shortest = std::min<std::int64_t>(shortest, left);
    }
    return static_cast<int>(std::clamp<std::int64_t>(shortest, 0, std::numeric_limits<int>::max()));
}

bool UploadQueue::isStalled(Clock::time_point now) const {
    return std::all_of(hosts_.begin(), hosts_.end(), [now](const auto& host) {
        return host.second.running.empty() && now < host.second.pausedUntil;
    });
}

}  // namespace corvane::transferd
