#include <corvane/Upload/StoredUploads.h>

#include <corvane/Platform/GZIPFile.h>
#include <corvane/Platform/Log.h>

#include <filesystem>
#include <iterator>
#include <utility>

namespace corvane {

namespace {

// A file that lost its contents, all or some, would be taken for delivered by a server that accepts anything, and be
// refused for good by one that does not.
bool isDamaged(const std::filesystem::path& file) {
    if (!isDamagedGZIPFile(file)) return false;
    Log::shared().error("Payload is empty or damaged, as after a power cut, and is not sent, identifier=%{public}@",
                        file.filename().string());
    return true;
}

}  // namespace

StoredUploads::StoredUploads(std::shared_ptr<SerialQueue> queue, std::shared_ptr<UploadServiceType> service,
                             std::shared_ptr<UploadRows> rows, std::shared_ptr<UploadDropboxType> dropbox,
                             std::shared_ptr<DeliveryLedger> ledger, std::shared_ptr<StorageBounds> bounds)
    : queue_(std::move(queue)),
      service_(std::move(service)),
      rows_(std::move(rows)),
      dropbox_(std::move(dropbox)),
      ledger_(std::move(ledger)),
      bounds_(std::move(bounds)) {}

void StoredUploads::registerAccessQueue(std::shared_ptr<SerialQueue> queue) {
    const Lock lock(mutex_);
    accessQueue_ = std::move(queue);
}

void StoredUploads::begin() {
    queue_->assertCurrent("StoredUploads::begin");
    try {
        list();
        bounds_->begin();  // what is given up is not sent before
        sendPortion();
    } catch (...) {
        Log::shared().error("Failed to requeue cancelled requests, error=%{public}@", AnyError::current().what());
    }
}

// Whoever waits for delivery waits for all of them, so that all are entered here.
void StoredUploads::list() {
    auto [stored, isInMemory] = rows_->stored();
    for (const auto& identifier : stored) ledger_->addEarlier(identifier);
    backlog_.add(stored);
    if (isInMemory) return;
    // Later where it takes long: an ordinary start needs no thread for it.
    const bool isMuch = stored.size() > Backlog::portion;
    std::set<std::string> recorded(std::move_iterator(stored.begin()), std::move_iterator(stored.end()));
    if (!isMuch) return removeOrphans(recorded);
    queue_->async([weak = weak_from_this(), recorded = std::move(recorded)] {
        if (const auto self = weak.lock()) self->removeOrphans(recorded);
    });
}

void StoredUploads::sendPortion() {
    const auto identifiers = backlog_.take();
    std::vector<PreparedUploadRequest> requests;
    bool isMoreReady = false;
    for (const auto& identifier : identifiers) {
        const auto row = bounds_->isWithdrawn(identifier) ? std::nullopt : storedRow(identifier);
        auto request = row ? retryRequest(*row) : std::nullopt;
        if (request) {
            requests.push_back(*std::move(request));
        } else {
            isMoreReady = backlog_.end(identifier);
        }
    }
    send(std::move(requests));
    if (isMoreReady) sendPortionLater();
}

void StoredUploads::send(std::vector<PreparedUploadRequest> requests) {
    queue_->assertCurrent("StoredUploads::send");
    for (const auto& request : requests) ledger_->begin(request.identifier);
    service_->resubmit(std::move(requests));
}

std::optional<PreparedUploadRequest> StoredUploads::find(const std::string& identifier) {
    if (bounds_->isWithdrawn(identifier)) return std::nullopt;
    queue_->assertCurrent("StoredUploads::find");
    const auto row = rows_->find(identifier);
    if (row) return preparedRequest(*row);
    ledger_->remove(identifier);  // another process has had its outcome
    return std::nullopt;
}

void StoredUploads::end(const std::vector<std::string>& identifiers) {
    bool isMoreReady = false;
    for (const auto& identifier : identifiers) isMoreReady = backlog_.end(identifier);
    if (isMoreReady) sendPortionLater();
}

void StoredUploads::sendPortionLater() {
    runLater([weak = weak_from_this()] {
        const auto self = weak.lock();
        if (!self) return;
        self->queue_->assertCurrent("StoredUploads::sendPortion");
        self->sendPortion();
    });
}

void StoredUploads::runLater(Task task) {
    const auto behind = accessQueue();
    if (behind == queue_) return queue_->async(std::move(task));
    behind->async([queue = queue_, work = std::move(task)]() mutable { queue->async(std::move(work)); });
}

std::shared_ptr<SerialQueue> StoredUploads::accessQueue() {
    const Lock lock(mutex_);
    return accessQueue_ ? accessQueue_ : queue_;
}

std::optional<SignedEntity> StoredUploads::storedRow(const std::string& identifier) {
    try {
        if (auto found = rows_->find(identifier)) return found;
    } catch (...) {
        Log::shared().error("Failed to requeue cancelled requests, error=%{public}@", AnyError::current().what());
    }
    ledger_->remove(identifier);  // another process's, or nobody's
    return std::nullopt;
}

std::optional<PreparedUploadRequest> StoredUploads::retryRequest(const SignedEntity& entity) {
    if (entity.retries <= maximumRetries) return preparedRequest(entity);
    dropExceeded(entity);
    return std::nullopt;
}

void StoredUploads::dropExceeded(const SignedEntity& entity) {
    Log::shared().default_("Retry dropped for exceeding allowed attempts, identifier=%{public}@", entity.identifier);
    try {
        rows_->end({entity.identifier, LedgerEntry::givenUpAttempts});
        dropbox_->finish(entity.identifier, std::nullopt);
    } catch (...) {
        Log::shared().error(
            "Failed to cleanup request that exceeded allowed attempts, identifier=%{public}@, error=%{public}@",
            entity.identifier, AnyError::current().what());
    }
    giveUp(entity.identifier, DeliveryUpdate::Reason::tooManyAttempts);
}

std::optional<PreparedUploadRequest> StoredUploads::preparedRequest(const SignedEntity& entity) {
    auto file = dropbox_->existingFile(entity.identifier);
    if (file && !isDamaged(*file))
        return PreparedUploadRequest{entity.identifier, entity.contentType, entity.userAgent, *std::move(file)};
    Log::shared().default_("Retry dropped for missing upload file, identifier=%{public}@", entity.identifier);
    try {
        rows_->end({entity.identifier, LedgerEntry::givenUpPayloadMissing});
        if (file) dropbox_->finish(entity.identifier, std::nullopt);
    } catch (...) {
        Log::shared().error(
            "Failed to cleanup request from db missing upload file, identifier=%{public}@, error=%{public}@",
            entity.identifier, AnyError::current().what());
    }
    giveUp(entity.identifier, DeliveryUpdate::Reason::payloadMissing);
    return std::nullopt;
}

void StoredUploads::giveUp(const std::string& identifier, DeliveryUpdate::Reason reason) {
    ledger_->settle(identifier, DeliveryLedger::Outcome::givenUp, {.reason = reason});
}

// Rows that are written meanwhile have payloads that are new.
void StoredUploads::removeOrphans(const std::set<std::string>& recorded) {
    auto orphans = dropbox_->abandonedPayloads(recorded);
    if (orphans.empty()) return;
    service_->inFlight([weak = weak_from_this(), orphans = std::move(orphans)](const std::set<std::string>& inFlight) {
        if (const auto self = weak.lock()) self->removeOrphans(orphans, inFlight);
    });
}

void StoredUploads::removeOrphans(const std::vector<std::string>& orphans, const std::set<std::string>& inFlight) {
    for (const auto& identifier : orphans) {
        if (inFlight.contains(identifier) || !dropbox_->existingFile(identifier)) continue;
        try {
            dropbox_->finish(identifier, std::nullopt);
            Log::shared().default_("Payload without a row was removed, identifier=%{public}@", identifier);
        } catch (...) {
            Log::shared().error("Failed to remove a payload without a row, identifier=%{public}@, error=%{public}@",
                                identifier, AnyError::current().what());
        }
    }
}

}  // namespace corvane
