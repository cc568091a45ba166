#include <corvane/Upload/LedgerBook.h>

#include <utility>

namespace corvane {

namespace {

void addTo(Ledger::Count& total, const Ledger::Count& count) {
    total.events += count.events;
    total.documents += count.documents;
}

void addTo(std::map<LedgerEntry, Ledger::Count>& totals, const std::map<LedgerEntry, Ledger::Count>& counts) {
    for (const auto& [entry, count] : counts) addTo(totals[entry], count);
}

}  // namespace

Ledger LedgerBook::ledger() const {
    const Lock lock(mutex_);
    Ledger ledger;
    for (const auto* totals : {&stored_.totals, &unwritten_, &writing_}) {
        for (const auto& [entry, count] : *totals) corvane::addTo(ledger, entry, count);
    }
    ledger.waiting = stored_.waiting;
    ledger.open = openOfOthers_;
    addTo(ledger.open, batches_.open);
    ledger.acceptedInRun = batches_.accepted;
    ledger.unaccounted = batches_.accepted - batches_.handedOver - batches_.forgotten - batches_.open.events;
    return ledger;
}

std::int64_t LedgerBook::bytesOnDisk() const {
    const Lock lock(mutex_);
    return stored_.waitingBytes + uncountedBytes_ + openBytesOfOthers_ + batches_.openBytes;
}

std::int64_t LedgerBook::waitingBytes() const {
    const Lock lock(mutex_);
    return stored_.waitingBytes;
}

void LedgerBook::setBatches(const Batches& batches) {
    const Lock lock(mutex_);
    batches_ = batches;
}

void LedgerBook::setStored(const Changes& stored) {
    const Lock lock(mutex_);
    stored_ = stored;
}

void LedgerBook::setUncountedBytes(std::int64_t bytes) {
    const Lock lock(mutex_);
    uncountedBytes_ = bytes;
}

void LedgerBook::addUncountedBytes(std::int64_t bytes) {
    const Lock lock(mutex_);
    uncountedBytes_ += bytes;
}

void LedgerBook::setOpenOfOthers(const Ledger::Count& count, std::int64_t bytes) {
    const Lock lock(mutex_);
    openOfOthers_ = count;
    openBytesOfOthers_ = bytes;
}

void LedgerBook::addOpenOfOthers(const Ledger::Count& count, std::int64_t bytes) {
    const Lock lock(mutex_);
    addTo(openOfOthers_, count);
    openBytesOfOthers_ += bytes;
}

void LedgerBook::addLater(LedgerEntry entry, const Ledger::Count& count) {
    const Lock lock(mutex_);
    addTo(unwritten_[entry], count);
}

bool LedgerBook::isWritten() const {
    const Lock lock(mutex_);
    return unwritten_.empty();
}

std::map<LedgerEntry, Ledger::Count> LedgerBook::write(const Changes& changes) {
    const Lock lock(mutex_);
    changing_ = changes;
    writing_ = std::exchange(unwritten_, {});
    auto all = writing_;
    addTo(all, changes.totals);
    return all;
}

void LedgerBook::didWrite(bool isCommitted) {
    const Lock lock(mutex_);
    if (isCommitted) {
        addTo(stored_.totals, writing_);
        addTo(stored_.totals, changing_.totals);
        addTo(stored_.waiting, changing_.waiting);
        stored_.waitingBytes += changing_.waitingBytes;
    } else {
        addTo(unwritten_, writing_);
    }
    writing_.clear();
    changing_ = {};
}

}  // namespace corvane
