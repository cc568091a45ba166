#include <corvane/Agent/Daemon/UploadQueue.h>

#include <corvane/Transfer/HTTPURL.h>
#include <corvane/Transfer/TransferError.h>

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

bool isBlocked(const AnyError& error) {
    const auto* known = error.as<TransferError>();
    return known && known->value() == TransferError::Code::blocked;
}

// Nothing of the document has reached the server, and no other document would have got any further.
bool isHeldUp(const std::optional<AnyError>& error) {
    const auto* known = error ? error->as<TransferError>() : nullptr;
    return known && (known->value() == TransferError::Code::unreachable || isBlocked(*error));
}

}  // namespace

std::vector<std::int64_t> UploadQueue::Host::uploads() const {
    std::vector<std::int64_t> numbers;
    numbers.reserve(waiting.size() + running.size());
    for (const auto& one : waiting) numbers.push_back(one.number);
    for (const auto& [number, one] : running) numbers.push_back(number);
    return numbers;
}

bool UploadQueue::Host::mayStart(Clock::time_point now) const {
    if (waiting.empty() || now < pausedUntil) return false;
    return static_cast<int>(running.size()) < (failures > 0 ? 1 : waiting.front().perHost);
}

std::string UploadQueue::pool(const TransferSubmission& submission) {
    return submission.trustedCertificates + '\n' + submission.proxy.url + '\n' + submission.proxy.exceptions;
}

void UploadQueue::add(std::int64_t number, const TransferSubmission& submission) {
    std::string server = HTTPURL::parse(submission.request.url).server();
    Host& host = hosts_[pool(submission) + ' ' + server];
    host.server = std::move(server);
    host.waiting.push_back({number, submission.limits.transfersPerHost});
    if (host.trouble) source_.troubleChanged(*host.trouble, {number});
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

void UploadQueue::settle(std::map<std::string, Host>::iterator host) {
    if (!host->second.waiting.empty() || !host->second.running.empty()) return;
    tellOver(host->second);
    hosts_.erase(host);
}

void UploadQueue::proceed(Clock::time_point now) {
    for (auto& [name, host] : hosts_) {
        while (host.mayStart(now)) startOne(host);
    }
    scheduler_.perform();
    for (; !arrived_.empty(); arrived_.pop_front()) finished(arrived_.front(), now);
    for (auto host = hosts_.begin(); host != hosts_.end();) settle(host++);
}

void UploadQueue::startOne(Host& host) {
    const Waiting next = host.waiting.front();
    try {
        if (auto transfer = source_.transfer(next.number)) run(host, next, *std::move(transfer));
    } catch (...) {
        ended_.push_back({next.number, {AnyError::current(), std::nullopt}});
        host.running.erase(next.number);
    }
    host.waiting.pop_front();  // last: what there is no memory for stays
}

void UploadQueue::run(Host& host, const Waiting& next, HTTPTransfer transfer) {
    transfer.didSend = [this, number = next.number](std::int64_t total, std::int64_t expected) {
        progress_.push_back({number, total, expected});
    };
    transfer.didComplete = [this, number = next.number](TransferOutcome outcome) {
        arrived_.push_back({number, std::move(outcome)});
    };
    host.running.emplace(next.number, next);
    scheduler_.start(static_cast<std::uint64_t>(next.number), std::move(transfer));
}

void UploadQueue::finished(const Ended& ended, Clock::time_point now) {
    const auto found = std::find_if(hosts_.begin(), hosts_.end(),
                                    [&](const auto& host) { return host.second.running.contains(ended.number); });
    if (found == hosts_.end()) return;
    Host& host = found->second;
    const bool waits = isHeldUp(ended.outcome.error);
    if (waits) {
        host.waiting.push_back(host.running.at(ended.number));
    } else {
        ended_.push_back(ended);
    }
    host.running.erase(ended.number);
    if (waits) {
        holdUp(host, *ended.outcome.error, now);
    } else {
        goOn(host);
    }
}

void UploadQueue::goOn(Host& host) {
    host.failures = 0;
    host.pausedUntil = Clock::time_point::min();
    tellOver(host);
}

void UploadQueue::tellOver(Host& host) {
    if (!host.trouble) return;
    host.trouble->lasts = false;
    source_.troubleChanged(*host.trouble, {});
    host.trouble.reset();
}

void UploadQueue::holdUp(Host& host, const AnyError& why, Clock::time_point now) {
    if (now >= host.pausedUntil) {  // those that ran beside the first to fail say nothing new
        ++host.failures;
        host.pausedUntil = now + delayAfter(host.failures, retryDelay_);
    }
    // One failure speaks for all: whoever has waited long enough does not wait for an attempt of its own.
    std::erase_if(host.waiting, [&](const Waiting& one) {
        const bool isOver = !source_.mayWait(one.number);
        if (isOver) ended_.push_back({one.number, {why, std::nullopt}});
        return isOver;
    });
    note(host, why);
}

void UploadQueue::note(Host& host, const AnyError& why) {
    if (host.trouble && host.trouble->isBlocked == isBlocked(why)) return;
    host.trouble = Trouble{++lastTrouble_, host.server, why.what(), isBlocked(why)};
    source_.troubleChanged(*host.trouble, host.uploads());
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

bool UploadQueue::isHopeless() const {
    return !hosts_.empty() &&
           std::all_of(hosts_.begin(), hosts_.end(), [](const auto& host) { return host.second.failures > 0; });
}

void UploadQueue::visitTroubles(
    const std::function<void(const Trouble&, const std::vector<std::int64_t>&)>& visit) const {
    for (const auto& [key, host] : hosts_) {
        if (host.trouble) visit(*host.trouble, host.uploads());
    }
}

}  // namespace corvane::transferd
