#include <corvane/Upload/DeliveryLedger.h>

namespace corvane {

namespace {

void addTo(DeliveryReport::Count& count, std::int64_t events) {
    count.events += events;
    ++count.documents;
}

}  // namespace

void DeliveryLedger::add(std::string_view identifier, std::int64_t events) {
    const Lock lock(mutex_);
    onTheirWay_.emplace(identifier, events);
}

void DeliveryLedger::remove(std::string_view identifier) {
    const Lock lock(mutex_);
    if (const auto found = onTheirWay_.find(identifier); found != onTheirWay_.end()) onTheirWay_.erase(found);
    if (onTheirWay_.empty()) settled_.notify_all();
}

void DeliveryLedger::settle(std::string_view identifier, Outcome outcome) {
    const Lock lock(mutex_);
    const auto found = onTheirWay_.find(identifier);
    if (found == onTheirWay_.end()) return;
    switch (outcome) {
        case Outcome::delivered:
            addTo(totals_.delivered, found->second);
            break;
        case Outcome::pending:
            addTo(totals_.pending, found->second);
            break;
        case Outcome::givenUp:
            addTo(totals_.givenUp, found->second);
            break;
    }
    onTheirWay_.erase(found);
    if (const auto followed = followed_.find(identifier); followed != followed_.end()) followed->second = outcome;
    if (onTheirWay_.empty()) settled_.notify_all();
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

std::optional<DeliveryLedger::Outcome> DeliveryLedger::takeOutcome(std::string_view identifier) {
    const Lock lock(mutex_);
    const auto found = followed_.find(identifier);
    if (found == followed_.end() || !found->second) return std::nullopt;
    const auto outcome = found->second;
    followed_.erase(found);
    return outcome;
}

DeliveryReport DeliveryLedger::reportLocked() const {
    auto report = totals_;
    for (const auto& [identifier, events] : onTheirWay_) addTo(report.pending, events);
    return report;
}

DeliveryReport DeliveryLedger::report() const {
    const Lock lock(mutex_);
    return reportLocked();
}

DeliveryReport DeliveryLedger::wait(std::chrono::steady_clock::time_point deadline) const {
    Lock lock(mutex_);
    while (!onTheirWay_.empty() && lock.waitUntil(settled_, deadline)) continue;
    return reportLocked();
}

}  // namespace corvane
