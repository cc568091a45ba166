#include <corvane/Processing/BatchCounts.h>

#include <utility>

namespace corvane {

namespace {

std::int64_t eventsOf(const UploadBatch& batch) {
    return static_cast<std::int64_t>(batch.count());
}

LedgerEntry entryOf(RejectedEvent::Reason reason) {
    switch (reason) {
        case RejectedEvent::Reason::noSession:
            return LedgerEntry::noSession;
        case RejectedEvent::Reason::missingData:
            return LedgerEntry::missingData;
        case RejectedEvent::Reason::encoding:
            return LedgerEntry::encoding;
        case RejectedEvent::Reason::notRecording:
            return LedgerEntry::notRecording;
        case RejectedEvent::Reason::other:
            break;
    }
    return LedgerEntry::otherProblem;
}

}  // namespace

BatchCounts::BatchCounts(std::shared_ptr<LedgerBook> book) : book_(std::move(book)) {}

void BatchCounts::reject(RejectedEvent::Reason reason) {
    book_->addLater(entryOf(reason), {1, 0});
}

void BatchCounts::handOver(const UploadBatch& batch) {
    counts_.handedOver += eventsOf(batch);
}

void BatchCounts::leave(const UploadBatch& batch) {
    handOver(batch);
    for (const auto& part : batch.parts()) {
        book_->addOpenOfOthers({static_cast<std::int64_t>(part.saved), part.saved != 0 ? 1 : 0},
                               static_cast<std::int64_t>(part.events->text().size()));
    }
}

void BatchCounts::settle(const UploadBatch& batch, const DeliveryLedger::Settled& settled) {
    handOver(batch);
    const bool isDelivered = settled.outcome == DeliveryLedger::Outcome::delivered;
    book_->addLater(isDelivered ? LedgerEntry::delivered : refusalOf(settled.cause.status.value_or(0)),
                    {eventsOf(batch), 1});
}

std::int64_t BatchCounts::forget(const UploadBatch& batch, bool hasRows) {
    counts_.forgotten += eventsOf(batch);
    std::int64_t unsaved = eventsOf(batch);
    for (const auto& part : batch.parts()) unsaved -= hasRows ? static_cast<std::int64_t>(part.saved) : 0;
    if (unsaved != 0) book_->addLater(LedgerEntry::givenUpForgotten, {unsaved, 0});
    return unsaved;
}

void BatchCounts::setOthers(const std::vector<UploadBatchEntity::Size>& rows) {
    Ledger::Count count;
    std::int64_t bytes = 0;
    for (const auto& row : rows) {
        count.events += row.events;
        ++count.documents;
        bytes += row.bytes;
    }
    book_->setOpenOfOthers(count, bytes);
}

void BatchCounts::handOver(const UploadBatchEntity& other) {
    book_->addOpenOfOthers({-static_cast<std::int64_t>(other.events->count()), -1},
                           -static_cast<std::int64_t>(other.events->text().size()));
}

void BatchCounts::Publication::add(const UploadBatch& batch) {
    counts_.counts_.open.events += eventsOf(batch);
    counts_.counts_.open.documents += static_cast<std::int64_t>(batch.parts().size());
    counts_.counts_.openBytes += static_cast<std::int64_t>(batch.bytes());
}

}  // namespace corvane
