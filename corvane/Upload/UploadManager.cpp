#include <corvane/Upload/UploadManager.h>

#include <corvane/Platform/Date.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/RecordingSwitch.h>
#include <corvane/Upload/UploadRequest.h>
#include <corvane/Upload/gzip.h>

#include <filesystem>
#include <utility>

namespace corvane {

namespace {

using Outcome = DeliveryLedger::Outcome;

SignedEntity newEntity(const UploadRequest& request, std::string identifier) {
    const auto date = now();
    return {.identifier = std::move(identifier),
            .createdDate = date,
            .contentType = request.resource->contentType() + "; version=" + request.resource->version(),
            .userAgent = request.client.identifier() + "/" + request.client.fullVersion(),
            .retries = 0,
            .retryAfterDate = date,
            .signature = ""};
}

/// What an upload counts as that is over; nothing for one that is not.
std::optional<LedgerEntry> entryOf(const UploadResult& result) {
    if (std::holds_alternative<UploadResult::Retry>(result.value)) return std::nullopt;
    const auto* refused = std::get_if<UploadResult::Failed>(&result.value);
    return refused ? refusalOf(refused->response.statusCode) : LedgerEntry::delivered;
}

PreparedUploadRequest prepared(const SignedEntity& entity, std::filesystem::path file) {
    return {entity.identifier, entity.contentType, entity.userAgent, std::move(file)};
}

}  // namespace

std::shared_ptr<UploadManager> UploadManager::create(std::shared_ptr<UploadServiceType> service,
                                                     std::shared_ptr<DeferredStore<SignedEntity>> deferredStore,
                                                     std::shared_ptr<UploadDropboxType> dropbox,
                                                     std::shared_ptr<DeliveryLedger> ledger,
                                                     std::shared_ptr<LedgerBook> book,
                                                     std::optional<std::chrono::milliseconds> retryDelay,
                                                     const StorageLimits& limits) {
    if (!ledger) ledger = std::make_shared<DeliveryLedger>();
    if (!book) book = std::make_shared<LedgerBook>();
    if (retryDelay) ledger->keepPending();
    std::shared_ptr<UploadManager> manager(new UploadManager(std::move(service), std::move(deferredStore),
                                                             std::move(dropbox), std::move(ledger), std::move(book),
                                                             retryDelay, limits));
    manager->service_->setDelegate(manager);
    return manager;
}

UploadManager::UploadManager(std::shared_ptr<UploadServiceType> service,
                             std::shared_ptr<DeferredStore<SignedEntity>> deferredStore,
                             std::shared_ptr<UploadDropboxType> dropbox, std::shared_ptr<DeliveryLedger> ledger,
                             std::shared_ptr<LedgerBook> book, std::optional<std::chrono::milliseconds> retryDelay,
                             const StorageLimits& limits)
    : service_(std::move(service)),
      rows_(std::make_shared<UploadRows>(std::move(deferredStore), book)),
      dropbox_(std::move(dropbox)),
      ledger_(std::move(ledger)),
      bounds_(std::make_shared<StorageBounds>(limits, queue_, service_, rows_, dropbox_, ledger_, std::move(book))),
      stored_(std::make_shared<StoredUploads>(queue_, service_, rows_, dropbox_, ledger_, bounds_)),
      retries_(retryDelay ? std::make_shared<UploadRetries>(*retryDelay, queue_, stored_) : nullptr) {}

UploadManager::~UploadManager() = default;

void UploadManager::open() {
    Log::shared().default_("Open upload manager");
    try {
        rows_->open();
    } catch (...) {
        Log::shared().error("Failed to open and create our table, error=%{public}@", AnyError::current().what());
    }
    queue_->sync([this] {
        queue_->assertCurrent("UploadManager::open");
        if (!std::exchange(hasSentStored_, true)) stored_->begin();
    });
}

void UploadManager::close() {
    Log::shared().default_("Close upload manager");
    try {
        rows_->writeLedger();
        rows_->close();
    } catch (...) {
        Log::shared().error("Failed to close database, error=%{public}@", AnyError::current().what());
    }
}

void UploadManager::registerAccessQueue(std::shared_ptr<SerialQueue> queue) {
    stored_->registerAccessQueue(queue);
    service_->registerAccessQueue(std::move(queue));
}

void UploadManager::forget() {
    {
        const Lock lock(mutex_);
        unrecorded_.clear();
    }
    bounds_->forget();
    auto documents = ledger_->unsettled();
    for (const auto& kept : storedDocuments()) documents.erase(kept);
    for (const auto& document : documents) {
        ledger_->settle(document, Outcome::givenUp, {.reason = DeliveryUpdate::Reason::forgotten});
        if (retries_) retries_->endElsewhere(document);
        // Rows that are no more, or never were on disk, have payloads that are.
        if (dropbox_->existingFile(document)) removeForgotten(document);
    }
    stored_->end({documents.begin(), documents.end()});
    // By name: what comes meanwhile is not among them.
    if (!documents.empty()) service_->cancel(std::move(documents), [](const std::set<std::string>&) {});
}

// What earlier epochs have left is not among them: they are another process's, which had begun the epoch before this
// one heard of it.
std::vector<std::string> UploadManager::storedDocuments() {
    try {
        return rows_->identifiers();
    } catch (...) {
        Log::shared().error("Failed to tell what is not to be forgotten, error=%{public}@", AnyError::current().what());
        return {};
    }
}

bool UploadManager::shouldResume(std::string_view identifier, std::function<void()> completion) {
    return service_->shouldResume(identifier, std::move(completion));
}

UploadTaken UploadManager::upload(const UploadRequest& request) {
    return queue_->sync([this, &request] {
        queue_->assertCurrent("UploadManager::upload");
        return uploadOnQueue(request);
    });
}

UploadTaken UploadManager::uploadOnQueue(const UploadRequest& request) {
    const auto& resource = *request.resource;
    auto identifier = resource.identifier();
    Log::shared().default_("Creating upload task, identifier=%{public}@", identifier);
    const auto json = resource.jsonObject();
    const auto body = json.isObject() ? gzipCompressed(json.text()) : gzipCompressed(json.toData());
    auto file = dropbox_->write(identifier, body, resource);
    if (request.durability == Durability::powerCut) dropbox_->sync(identifier);
    const auto entity = newEntity(request, std::move(identifier));
    const auto taken = record(entity, static_cast<std::int64_t>(body.size()), request);
    if (taken == UploadTaken::forgotten) {
        removeForgotten(entity.identifier);
        return taken;
    }
    service_->submit(prepared(entity, std::move(file)));
    ledger_->begin(entity.identifier);
    bounds_->keep(static_cast<std::int64_t>(body.size()));
    return taken;
}

// Whoever removes everything may have come before.
void UploadManager::removeForgotten(const std::string& identifier) {
    try {
        dropbox_->finish(identifier, std::nullopt);
    } catch (...) {
        Log::shared().default_("Payload was removed meanwhile, identifier=%{public}@, error=%{public}@", identifier,
                               AnyError::current().what());
    }
}

UploadTaken UploadManager::record(const SignedEntity& entity, std::int64_t bytes, const UploadRequest& request) {
    try {
        const DocumentEntity document{entity.identifier, request.events, bytes};
        const bool isRecorded = rows_->record(entity, document, request.epoch, request.removeBackup);
        return isRecorded ? UploadTaken::recorded : UploadTaken::forgotten;
    } catch (...) {
        if (RecordingSwitch::epoch() > request.epoch) return UploadTaken::forgotten;
        // This attempt is made all the same; if it fails, the contents go out again from where they are kept.
        const Lock lock(mutex_);
        unrecorded_.insert(entity.identifier);
        return UploadTaken::underWay;
    }
}

void UploadManager::uploadService(UploadServiceType& service, const UploadResult& result) {
    uploadServiceTogether(service, {result});
}

void UploadManager::uploadServiceTogether(UploadServiceType&, const std::vector<UploadResult>& results) {
    std::vector<std::string> all;
    std::vector<UploadRows::Ending> over;
    for (const auto& result : results) {
        all.push_back(result.identifier());
        if (const auto entry = entryOf(result)) over.push_back({result.identifier(), *entry});
    }
    const auto rowProblem = rows_->end(over);
    for (const auto& result : results) {
        if (const auto* retry = std::get_if<UploadResult::Retry>(&result.value)) {
            didFailForNow(*retry);
        } else {
            didFinish(result, rowProblem);
        }
    }
    stored_->end(all);
    if (retries_) retries_->end(results);
}

void UploadManager::didFinish(const UploadResult& result, const std::optional<AnyError>& rowProblem) {
    const auto& identifier = result.identifier();
    const auto* success = std::get_if<UploadResult::Success>(&result.value);
    forgetUnrecorded(identifier);
    bounds_->end(identifier);
    auto problem = rowProblem;
    try {
        const auto& response = success ? success->response : std::get<UploadResult::Failed>(result.value).response;
        if (!problem) dropbox_->finish(identifier, response);
    } catch (...) {
        problem = AnyError::current();
    }
    if (problem) {
        Log::shared().error(
            "Completed upload but failed to cleanup tracking data, identifier=%{public}@, error=%{public}@", identifier,
            problem->what());
    }
    ledger_->settle(identifier, success ? Outcome::delivered : Outcome::givenUp, result.cause());
}

// Without a row nothing is left to send again, unless the row could not be written: then the contents stayed where they
// were kept.
void UploadManager::didFailForNow(const UploadResult::Retry& retry) {
    const bool wasUnrecorded = forgetUnrecorded(retry.identifier);
    if (const auto reason = bounds_->takeReason(retry.identifier)) return bounds_->giveUp(retry.identifier, *reason);
    bool goesOutAgain = true;
    try {
        const bool isFirstOfRun = !retries_ || retries_->isFirstCounted(retry);
        goesOutAgain = rows_->countRetry(retry, isFirstOfRun) || wasUnrecorded;
    } catch (...) {
        Log::shared().error("Failed to mark retry, identifier=%{public}@, error=%{public}@", retry.identifier,
                            AnyError::current().what());
    }
    // Who had it cancelled because its row was to go has told of it.
    if (!goesOutAgain && retry.cause.reason == DeliveryUpdate::Reason::cancelled) return;
    ledger_->settle(retry.identifier, goesOutAgain ? Outcome::pending : Outcome::givenUp, retry.cause);
}

bool UploadManager::forgetUnrecorded(const std::string& identifier) {
    const Lock lock(mutex_);
    return unrecorded_.erase(identifier) > 0;
}

void UploadManager::uploadEndedElsewhere(const UploadResult& result) {
    const auto& identifier = result.identifier();
    forgetUnrecorded(identifier);
    bounds_->end(identifier);
    stored_->end({identifier});
    if (retries_) retries_->endElsewhere(identifier);
    const auto cause = result.cause();
    if (std::holds_alternative<UploadResult::Success>(result.value)) {
        return ledger_->settle(identifier, Outcome::delivered, cause);
    }
    const bool goesOutAgain = std::holds_alternative<UploadResult::Retry>(result.value) && hasRow(identifier);
    ledger_->settle(identifier, goesOutAgain ? Outcome::pending : Outcome::givenUp, cause);
}

void UploadManager::uploadDidSend(const std::string& identifier, std::int64_t sent, std::int64_t expected) {
    ledger_->progress(identifier, sent, expected);
}

void UploadManager::uploadsAreHeldUp(bool lasts) {
    ledger_->holdUp(lasts);
}

std::shared_ptr<const std::atomic<bool>> UploadManager::progressIsWanted() const noexcept {
    return {ledger_->news(), &ledger_->news()->isWanted()};
}

bool UploadManager::hasRow(const std::string& identifier) {
    try {
        return rows_->find(identifier).has_value();
    } catch (...) {
        Log::shared().error("Failed to look for an upload, identifier=%{public}@, error=%{public}@", identifier,
                            AnyError::current().what());
        return true;  // it is there as far as anybody knows
    }
}

}  // namespace corvane
