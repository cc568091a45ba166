#include <corvane/Upload/DeliveryLedger.h>

#include <algorithm>
#include <limits>
#include <string>
#include <utility>

namespace corvane {

namespace {

using Step = DeliveryUpdate::Step;

void addTo(DeliveryReport::Count& count, std::optional<std::int64_t> events) {
    count.events += events.value_or(0);
    ++count.documents;
}

DeliveryReport::Count& countOf(DeliveryReport& totals, DeliveryLedger::Outcome outcome) {
    switch (outcome) {
        case DeliveryLedger::Outcome::delivered:
            return totals.delivered;
        case DeliveryLedger::Outcome::pending:
            return totals.pending;
        case DeliveryLedger::Outcome::givenUp:
            break;
    }
    return totals.givenUp;
}

Step stepOf(DeliveryLedger::Outcome outcome) {
    switch (outcome) {
        case DeliveryLedger::Outcome::delivered:
            return Step::delivered;
        case DeliveryLedger::Outcome::pending:
            return Step::deferred;
        case DeliveryLedger::Outcome::givenUp:
            break;
    }
    return Step::givenUp;
}

}  // namespace

void DeliveryLedger::keepPending() {
    const Lock lock(mutex_);
    keepsPending_ = true;
}

void DeliveryLedger::add(std::string_view identifier, std::optional<std::int64_t> events) {
    const Lock lock(mutex_);
    if (pending_.contains(identifier)) return;
    if (onTheirWay_.try_emplace(std::string(identifier), Document{events, lastNumber_ + 1}).second) ++lastNumber_;
}

void DeliveryLedger::remove(std::string_view identifier) {
    const Lock lock(mutex_);
    if (const auto found = onTheirWay_.find(identifier); found != onTheirWay_.end()) {
        strikeOut(found);
    } else if (const auto again = pending_.find(identifier); again != pending_.end()) {
        pending_.erase(again);
    }
}

DeliveryLedger::Document* DeliveryLedger::find(std::string_view identifier) {
    for (auto* documents : {&onTheirWay_, &pending_}) {
        if (const auto found = documents->find(identifier); found != documents->end()) return &found->second;
    }
    return nullptr;
}

DeliveryLedger::Documents::node_type DeliveryLedger::strikeOut(Documents::iterator document) {
    auto struckOut = onTheirWay_.extract(document);
    if (onTheirWay_.empty()) heldUpTo_ = 0;
    settled_.notify_all();
    return struckOut;
}

void DeliveryLedger::begin(std::string_view identifier) {
    {
        const Lock lock(mutex_);
        auto* const document = find(identifier);
        if (!document || std::exchange(document->isUnderWay, true)) return;
        tell(Step::underWay, identifier, document);
    }
    news_->post();
}

void DeliveryLedger::progress(std::string_view identifier, std::int64_t sent, std::int64_t expected) {
    {
        const Lock lock(mutex_);
        const auto* const document = find(identifier);
        if (!document) return;
        heldUpTo_ = 0;
        tell(Step::progress, identifier, document, {}, sent, expected);
    }
    news_->post();
}

void DeliveryLedger::settle(std::string_view identifier, Outcome outcome, const DeliveryUpdate::Cause& cause) {
    {
        const Lock lock(mutex_);
        noteServer(cause.reason);
        tell(stepOf(outcome), identifier, find(identifier), cause);
        if (const auto found = onTheirWay_.find(identifier); found != onTheirWay_.end()) {
            fold(found, outcome);
            const auto followed = followed_.find(identifier);
            if (followed != followed_.end()) followed->second = Settled{outcome, cause};
        } else if (const auto again = pending_.find(identifier); again != pending_.end()) {
            again->second.isUnderWay = false;
            if (outcome != Outcome::pending) {
                addTo(countOf(totals_, outcome), again->second.events);
                pending_.erase(again);
            }
        }
    }
    news_->post();
}

void DeliveryLedger::fold(Documents::iterator document, Outcome outcome) {
    auto settled = strikeOut(document);
    if (outcome == Outcome::pending && keepsPending_) {
        settled.mapped().isUnderWay = false;
        pending_.insert(std::move(settled));
    } else {
        addTo(countOf(totals_, outcome), settled.mapped().events);
    }
}

std::set<std::string> DeliveryLedger::unsettled() {
    const Lock lock(mutex_);
    std::set<std::string> identifiers;
    for (const auto& [identifier, document] : onTheirWay_) identifiers.insert(identifier);
    for (const auto& [identifier, document] : pending_) identifiers.insert(identifier);
    return identifiers;
}

void DeliveryLedger::noteServer(DeliveryUpdate::Reason reason) {
    using Reason = DeliveryUpdate::Reason;
    if (reason == Reason::answer) {
        heldUpTo_ = 0;
    } else if (reason == Reason::unreachable || reason == Reason::blocked) {
        heldUpTo_ = std::max(heldUpTo_, lastNumber_);
        settled_.notify_all();
    }
}

void DeliveryLedger::holdUp(bool lasts) {
    const Lock lock(mutex_);
    heldUpTo_ = lasts ? std::numeric_limits<std::uint64_t>::max() : 0;
    settled_.notify_all();
}

void DeliveryLedger::tell(Step step, std::string_view identifier, const Document* document,
                          const DeliveryUpdate::Cause& cause, std::int64_t sent, std::int64_t expected) noexcept {
    if (!news_->isWanted()) return;
    try {
        news_->add({step, std::string(identifier), document ? document->events : std::nullopt, cause, sent, expected});
    } catch (...) {
        news_->addLoss();
    }
}

bool DeliveryLedger::follow(std::string_view identifier) {
    const Lock lock(mutex_);
    if (!onTheirWay_.contains(identifier)) return false;
    followed_.try_emplace(std::string(identifier));
    return true;
}

void DeliveryLedger::unfollow(std::string_view identifier) {
    const Lock lock(mutex_);
    if (const auto found = followed_.find(identifier); found != followed_.end()) followed_.erase(found);
}

std::optional<DeliveryLedger::Settled> DeliveryLedger::takeOutcome(std::string_view identifier) {
    const Lock lock(mutex_);
    const auto found = followed_.find(identifier);
    if (found == followed_.end() || !found->second) return std::nullopt;
    auto settled = found->second;
    followed_.erase(found);
    return settled;
}

DeliveryReport DeliveryLedger::reportLocked() const {
    auto report = totals_;
    for (const auto& [identifier, document] : onTheirWay_) addTo(report.pending, document.events);
    for (const auto& [identifier, document] : pending_) addTo(report.pending, document.events);
    return report;
}

DeliveryReport DeliveryLedger::report() const {
    const Lock lock(mutex_);
    return reportLocked();
}

DeliveryReport DeliveryLedger::wait(std::chrono::steady_clock::time_point deadline, bool onlyWhileReachable) const {
    Lock lock(mutex_);
    while (!isSettledLocked(onlyWhileReachable) && lock.waitUntil(settled_, deadline)) continue;
    return reportLocked();
}

bool DeliveryLedger::isSettled(bool onlyWhileReachable) const {
    const Lock lock(mutex_);
    return isSettledLocked(onlyWhileReachable);
}

bool DeliveryLedger::isSettledLocked(bool onlyWhileReachable) const {
    if (!onlyWhileReachable || heldUpTo_ == 0) return onTheirWay_.empty();
    return std::all_of(onTheirWay_.begin(), onTheirWay_.end(),
                       [to = heldUpTo_](const auto& one) { return one.second.number <= to; });
}

}  // namespace corvane
