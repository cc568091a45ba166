#include <corvane/Upload/UploadRetries.h>

#include <corvane/Platform/Log.h>
#include <corvane/Platform/UUID.h>

#include <algorithm>
#include <functional>
#include <limits>
#include <optional>
#include <utility>

namespace corvane {

namespace {

double chance() {
    constexpr double range = static_cast<double>(std::numeric_limits<std::size_t>::max());
    return static_cast<double>(std::hash<std::string>()(newUUID())) / range;
}

// Nothing of the document has reached the server then.
bool isAttempt(DeliveryUpdate::Reason reason) {
    return reason != DeliveryUpdate::Reason::unreachable && reason != DeliveryUpdate::Reason::blocked;
}

}  // namespace

UploadRetries::UploadRetries(std::chrono::milliseconds firstDelay, std::shared_ptr<SerialQueue> queue,
                             std::shared_ptr<StoredUploads> stored)
    : queue_(std::move(queue)), stored_(std::move(stored)), schedule_(firstDelay, chance()) {}

bool UploadRetries::isFirstCounted(const UploadResult::Retry& retry) {
    if (!retry.isCounted) return false;
    const Lock lock(mutex_);
    return !std::exchange(documents_[retry.identifier].isCounted, true);
}

void UploadRetries::end(const std::vector<UploadResult>& results) {
    std::vector<std::string> exhausted;
    {
        const Lock lock(mutex_);
        bool isMoreReady = false;
        for (const auto& result : results) {
            isMoreReady = backlog_.end(result.identifier());
            if (const auto* retry = std::get_if<UploadResult::Retry>(&result.value)) {
                noteRetry(*retry, exhausted);
                continue;
            }
            forget(result.identifier());
            pass_.isAnswered = true;
            if (!std::holds_alternative<UploadResult::Success>(result.value)) continue;
            pass_.hasDelivered = true;
            schedule_.succeed(BootClock::now());
        }
        proceed(isMoreReady);
    }
    for (const auto& identifier : exhausted) {
        Log::shared().default_("Upload waits for the next run after %ld attempts, identifier=%{public}@",
                               maximumAttempts, identifier);
    }
}

void UploadRetries::noteRetry(const UploadResult::Retry& retry, std::vector<std::string>& exhausted) {
    auto& document = documents_[retry.identifier];
    if (document.isInPass) pass_.hasFailed = true;
    leavePass(document);
    if (isAttempt(retry.cause.reason)) ++document.attempts;
    if (retry.serverDelay) schedule_.hold(BootClock::now(), *retry.serverDelay);
    document.number = ++lastNumber_;
    const bool isExhausted = document.attempts >= maximumAttempts;
    setWaiting(document, !isExhausted);
    if (isExhausted) exhausted.push_back(retry.identifier);
}

void UploadRetries::endElsewhere(const std::string& identifier) {
    const Lock lock(mutex_);
    const bool isMoreReady = backlog_.end(identifier);
    forget(identifier);
    proceed(isMoreReady);
}

void UploadRetries::setWaiting(Document& document, bool isWaiting) {
    if (document.isWaiting == isWaiting) return;
    document.isWaiting = isWaiting;
    isWaiting ? ++waiting_ : --waiting_;
}

void UploadRetries::leavePass(Document& document) {
    if (std::exchange(document.isInPass, false)) --pass_.left;
}

void UploadRetries::putBack(const std::string& identifier) {
    const auto found = documents_.find(identifier);
    if (found == documents_.end()) return;
    leavePass(found->second);
    setWaiting(found->second, true);
}

void UploadRetries::forget(const std::string& identifier) {
    const auto found = documents_.find(identifier);
    if (found == documents_.end()) return;
    leavePass(found->second);
    setWaiting(found->second, false);
    documents_.erase(found);
}

void UploadRetries::begin() {
    const Lock lock(mutex_);
    if (pass_.runs) return;
    std::vector<std::pair<std::uint64_t, std::string>> waiting;
    for (const auto& [identifier, document] : documents_) {
        if (document.isWaiting) waiting.emplace_back(document.number, identifier);
    }
    std::sort(waiting.begin(), waiting.end());
    std::vector<std::string> identifiers;
    identifiers.reserve(waiting.size());
    for (auto& one : waiting) identifiers.push_back(std::move(one.second));
    backlog_.add(identifiers);
    schedule_.begin(chance());
    pass_ = {.runs = true};
    for (const auto& identifier : identifiers) {
        auto& document = documents_[identifier];
        setWaiting(document, false);
        document.isInPass = true;
        ++pass_.left;
    }
    sendPortionLater();
}

void UploadRetries::sendPortionLater() {
    stored_->runLater([weak = weak_from_this()] {
        const auto self = weak.lock();
        if (!self) return;
        self->queue_->assertCurrent("UploadRetries::sendPortion");
        self->sendPortion();
    });
}

void UploadRetries::sendPortion() {
    stored_->keepBounds();
    std::vector<PreparedUploadRequest> requests;
    bool isMoreReady = false;
    for (const auto& identifier : backlog_.take()) {
        bool isReadable = true;
        std::optional<PreparedUploadRequest> request;
        try {
            request = stored_->find(identifier);
        } catch (...) {
            Log::shared().error("Failed to requeue cancelled requests, error=%{public}@", AnyError::current().what());
            isReadable = false;
        }
        if (request) {
            requests.push_back(*std::move(request));
            continue;
        }
        isMoreReady = backlog_.end(identifier);
        const Lock lock(mutex_);
        if (!isReadable) pass_.hasFailed = true;
        isReadable ? forget(identifier) : putBack(identifier);
    }
    stored_->send(std::move(requests));
    const Lock lock(mutex_);
    proceed(isMoreReady);
}

void UploadRetries::proceed(bool isMoreReady) {
    if (pass_.left > 0) {
        const bool isIdle = backlog_.isIdle();
        const bool isInVain = isIdle && pass_.hasFailed && !pass_.isAnswered;
        if (isInVain || schedule_.isHeld(BootClock::now())) {
            for (const auto& identifier : backlog_.takeBack()) putBack(identifier);
        } else if (isMoreReady && (isIdle || pass_.isAnswered)) {
            sendPortionLater();
        }
    }
    if (pass_.left > 0) return;
    if (pass_.runs) {
        (void)backlog_.takeBack();  // names of what ended before its turn
        if (!pass_.hasDelivered) schedule_.fail();
        pass_ = {};
    }
    setTimer();
}

void UploadRetries::setTimer() {
    if (waiting_ == 0) {
        schedule_.drop();
        return timer_.cancel();
    }
    const auto now = BootClock::now();
    schedule_.plan(now);
    const auto due = *schedule_.due();
    if (timer_.isSet() && timerDue_ == due) return;
    timer_ = Timer::after(*stored_->accessQueue(), due - now, [weak = weak_from_this()] {
        if (const auto self = weak.lock()) self->begin();
    });
    timerDue_ = due;
}

}  // namespace corvane
