#include <corvane/Processing/TerminatedBatches.h>

#include <corvane/Platform/Error.h>
#include <corvane/Platform/Log.h>

#include <set>
#include <utility>
#include <vector>

namespace corvane {

namespace {
using Rows = Store<UploadBatchEntity>;
}  // namespace

TerminatedBatches::TerminatedBatches(std::shared_ptr<DeferredStore<UploadBatchEntity>> deferredStore,
                                     std::shared_ptr<DeliveryLedger> ledger)
    : deferredStore_(std::move(deferredStore)), ledger_(std::move(ledger)) {}

void TerminatedBatches::list() {
    std::vector<std::string> found;
    try {
        found = deferredStore_->perform([](Rows& rows) { return rows.keys(); });
    } catch (...) {
        Log::shared().error("Failed to submit rehydrated failed queues, error=%{public}@", AnyError::current().what());
        return;
    }
    const std::set<std::string> listed(identifiers_.begin(), identifiers_.end());
    for (auto& identifier : found) {
        if (listed.contains(identifier)) continue;
        ledger_->addEarlier(identifier);
        identifiers_.push_back(std::move(identifier));
    }
}

void TerminatedBatches::clear() {
    for (const auto& identifier : identifiers_) ledger_->remove(identifier);
    identifiers_.clear();
}

std::optional<UploadBatchEntity> TerminatedBatches::read(const std::string& identifier) const {
    try {
        auto found = deferredStore_->perform([&](Rows& rows) { return rows.fetchWhere("identifier", identifier); });
        if (!found.empty()) return std::move(found.front());
    } catch (...) {
        Log::shared().error("Failed to submit rehydrated failed queues, error=%{public}@",
                            identifier + ": " + AnyError::current().what());
    }
    return std::nullopt;
}

}  // namespace corvane
