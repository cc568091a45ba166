#include <corvane/Upload/UploadManager.h>

#include <corvane/Platform/Date.h>
#include <corvane/Platform/Log.h>
#include <corvane/Upload/UploadRequest.h>
#include <corvane/Upload/gzip.h>

#include <iterator>
#include <utility>

namespace corvane {

namespace {

using Outcome = DeliveryLedger::Outcome;
using Rows = Store<SignedEntity>;

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

// A payload never is; a file that lost its contents would be taken for delivered by a server that accepts anything.
bool isEmpty(const std::filesystem::path& file) {
    std::error_code failed;
    return std::filesystem::file_size(file, failed) == 0 && !failed;
}

PreparedUploadRequest prepared(const SignedEntity& entity, std::filesystem::path file) {
    return {entity.identifier, entity.contentType, entity.userAgent, std::move(file)};
}

}  // namespace

std::shared_ptr<UploadManager> UploadManager::create(std::shared_ptr<UploadServiceType> service,
                                                     std::shared_ptr<DeferredStore<SignedEntity>> deferredStore,
                                                     std::shared_ptr<UploadDropboxType> dropbox,
                                                     std::shared_ptr<DeliveryLedger> ledger) {
    std::shared_ptr<UploadManager> manager(
        new UploadManager(std::move(service), std::move(deferredStore), std::move(dropbox), std::move(ledger)));
    manager->service_->setDelegate(manager);
    return manager;
}

UploadManager::UploadManager(std::shared_ptr<UploadServiceType> service,
                             std::shared_ptr<DeferredStore<SignedEntity>> deferredStore,
                             std::shared_ptr<UploadDropboxType> dropbox, std::shared_ptr<DeliveryLedger> ledger)
    : service_(std::move(service)),
      deferredStore_(std::move(deferredStore)),
      dropbox_(std::move(dropbox)),
      ledger_(std::move(ledger)) {}

UploadManager::~UploadManager() = default;

void UploadManager::open() {
    Log::shared().default_("Open upload manager");
    try {
        deferredStore_->perform([](Rows& rows) {
            rows.open();
            rows.createTable();
        });
    } catch (...) {
        Log::shared().error("Failed to open and create our table, error=%{public}@", AnyError::current().what());
    }
    queue_.sync([this] {
        queue_.assertCurrent("UploadManager::open");
        requeueCancelledRequests();
    });
}

void UploadManager::close() {
    Log::shared().default_("Close upload manager");
    try {
        deferredStore_->perform([](Rows& rows) { rows.close(); });
    } catch (...) {
        Log::shared().error("Failed to close database, error=%{public}@", AnyError::current().what());
    }
}

void UploadManager::registerAccessQueue(std::shared_ptr<SerialQueue> queue) {
    {
        const Lock lock(mutex_);
        accessQueue_ = queue;
    }
    service_->registerAccessQueue(std::move(queue));
}

bool UploadManager::shouldResume(std::string_view identifier, std::function<void()> completion) {
    return service_->shouldResume(identifier, std::move(completion));
}

UploadTaken UploadManager::upload(const UploadRequest& request) {
    return queue_.sync([this, &request] {
        queue_.assertCurrent("UploadManager::upload");
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
    const auto entity = newEntity(request, std::move(identifier));
    const auto taken = record(entity, request);
    service_->submit(prepared(entity, std::move(file)));
    if (ledger_) ledger_->begin(entity.identifier);
    return taken;
}

UploadTaken UploadManager::record(const SignedEntity& entity, const UploadRequest& request) {
    try {
        deferredStore_->perform([&](Rows& rows) {
            if (!request.removeBackup) return rows.insert(entity);
            rows.transaction([&] {
                rows.insert(entity);
                request.removeBackup(rows.connection());
            });
        });
        return UploadTaken::recorded;
    } catch (...) {
        // This attempt is made all the same; if it fails, the contents go out again from where they are kept.
        const Lock lock(mutex_);
        unrecorded_.insert(entity.identifier);
        return UploadTaken::underWay;
    }
}

void UploadManager::requeueCancelledRequests() {
    if (std::exchange(retriedIncompleteRequests_, true)) return;
    try {
        listStoredRequests();
        retryStoredRequests();
    } catch (...) {
        Log::shared().error("Failed to requeue cancelled requests, error=%{public}@", AnyError::current().what());
    }
}

// Whoever waits for delivery waits for all of them, so that all are entered here.
void UploadManager::listStoredRequests() {
    bool isMemory = false;
    auto stored = deferredStore_->perform([&](Rows& rows) {
        isMemory = rows.connection()->location().isMemory();
        return rows.keys();
    });
    if (ledger_) {
        for (const auto& identifier : stored) ledger_->addEarlier(identifier);
    }
    backlog_.add(stored);
    if (isMemory) return;  // it knows nothing of the rows on disk
    // Later where it takes long: an ordinary start needs no thread for it.
    const bool isMuch = stored.size() > Backlog::portion;
    std::set<std::string> recorded(std::move_iterator(stored.begin()), std::move_iterator(stored.end()));
    if (!isMuch) return removeOrphans(recorded);
    queue_.async([weak = weak_from_this(), recorded = std::move(recorded)] {
        if (const auto manager = weak.lock()) manager->removeOrphans(recorded);
    });
}

void UploadManager::retryStoredRequests() {
    const auto identifiers = backlog_.take();
    std::vector<PreparedUploadRequest> requests;
    bool isMoreReady = false;
    for (const auto& identifier : identifiers) {
        const auto row = storedRow(identifier);
        auto request = row ? retryRequest(*row) : std::nullopt;
        if (request) {
            requests.push_back(*std::move(request));
        } else {
            isMoreReady = backlog_.end(identifier);
        }
    }
    for (const auto& request : requests) {
        if (ledger_) ledger_->begin(request.identifier);
    }
    service_->resubmit(std::move(requests));
    if (isMoreReady) retryStoredRequestsLater();
}

// Behind the submissions that wait: results overtake them, so that a backlog that ends quickly would keep them waiting.
void UploadManager::retryStoredRequestsLater() {
    const auto retry = [weak = weak_from_this()] {
        const auto manager = weak.lock();
        if (!manager) return;
        manager->queue_.async([weak] {
            const auto still = weak.lock();
            if (!still) return;
            still->queue_.assertCurrent("UploadManager::retryStoredRequests");
            still->retryStoredRequests();
        });
    };
    std::shared_ptr<SerialQueue> accessQueue;
    {
        const Lock lock(mutex_);
        accessQueue = accessQueue_;
    }
    accessQueue ? accessQueue->async(retry) : retry();
}

std::optional<SignedEntity> UploadManager::storedRow(const std::string& identifier) {
    try {
        auto found = deferredStore_->perform([&](Rows& rows) { return rows.fetchWhere("identifier", identifier); });
        if (!found.empty()) return std::move(found.front());
    } catch (...) {
        Log::shared().error("Failed to requeue cancelled requests, error=%{public}@", AnyError::current().what());
    }
    if (ledger_) ledger_->remove(identifier);  // another process's, or nobody's
    return std::nullopt;
}

std::optional<PreparedUploadRequest> UploadManager::retryRequest(const SignedEntity& entity) {
    if (entity.retries <= maximumRetries) return preparedRequest(entity);
    dropExceeded(entity);
    return std::nullopt;
}

// Rows that are written meanwhile have payloads that are new.
void UploadManager::removeOrphans(const std::set<std::string>& recorded) {
    auto orphans = dropbox_->abandonedPayloads(recorded);
    if (orphans.empty()) return;
    service_->inFlight([weak = weak_from_this(), orphans = std::move(orphans)](const std::set<std::string>& inFlight) {
        if (const auto manager = weak.lock()) manager->removeOrphans(orphans, inFlight);
    });
}

void UploadManager::removeOrphans(const std::vector<std::string>& orphans, const std::set<std::string>& inFlight) {
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

void UploadManager::dropExceeded(const SignedEntity& entity) {
    Log::shared().default_("Retry dropped for exceeding allowed attempts, identifier=%{public}@", entity.identifier);
    try {
        deleteRow(entity.identifier);
        dropbox_->finish(entity.identifier, std::nullopt);
    } catch (...) {
        Log::shared().error(
            "Failed to cleanup request that exceeded allowed attempts, identifier=%{public}@, error=%{public}@",
            entity.identifier, AnyError::current().what());
    }
    settle(entity.identifier, Outcome::givenUp, {.reason = DeliveryUpdate::Reason::tooManyAttempts});
}

std::optional<PreparedUploadRequest> UploadManager::preparedRequest(const SignedEntity& entity) {
    auto file = dropbox_->existingFile(entity.identifier);
    if (file && !isEmpty(*file)) return prepared(entity, *std::move(file));
    Log::shared().default_("Retry dropped for missing upload file, identifier=%{public}@", entity.identifier);
    try {
        deleteRow(entity.identifier);
        if (file) dropbox_->finish(entity.identifier, std::nullopt);
    } catch (...) {
        Log::shared().error(
            "Failed to cleanup request from db missing upload file, identifier=%{public}@, error=%{public}@",
            entity.identifier, AnyError::current().what());
    }
    settle(entity.identifier, Outcome::givenUp, {.reason = DeliveryUpdate::Reason::payloadMissing});
    return std::nullopt;
}

void UploadManager::uploadService(UploadServiceType& service, const UploadResult& result) {
    uploadServiceTogether(service, {result});
}

void UploadManager::uploadServiceTogether(UploadServiceType&, const std::vector<UploadResult>& results) {
    std::vector<std::string> over;
    for (const auto& result : results) {
        if (!std::holds_alternative<UploadResult::Retry>(result.value)) over.push_back(result.identifier());
    }
    const auto rowProblem = deleteRows(over);
    bool isMoreReady = false;
    for (const auto& result : results) {
        if (const auto* retry = std::get_if<UploadResult::Retry>(&result.value)) {
            didFailForNow(*retry);
        } else {
            didFinish(result, rowProblem);
        }
        isMoreReady = backlog_.end(result.identifier());
    }
    if (isMoreReady) retryStoredRequestsLater();
}

void UploadManager::didFinish(const UploadResult& result, const std::optional<AnyError>& rowProblem) {
    const auto& identifier = result.identifier();
    const auto* success = std::get_if<UploadResult::Success>(&result.value);
    forgetUnrecorded(identifier);
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
    settle(identifier, success ? Outcome::delivered : Outcome::givenUp, result.cause());
}

// Without a row nothing is left to send again, unless the row could not be written: then the contents stayed where they
// were kept.
void UploadManager::didFailForNow(const UploadResult::Retry& retry) {
    const bool wasUnrecorded = forgetUnrecorded(retry.identifier);
    bool goesOutAgain = true;
    try {
        goesOutAgain = markRetry(retry) || wasUnrecorded;
    } catch (...) {
        Log::shared().error("Failed to mark retry, identifier=%{public}@, error=%{public}@", retry.identifier,
                            AnyError::current().what());
    }
    settle(retry.identifier, goesOutAgain ? Outcome::pending : Outcome::givenUp, retry.cause);
}

bool UploadManager::forgetUnrecorded(const std::string& identifier) {
    const Lock lock(mutex_);
    return unrecorded_.erase(identifier) > 0;
}

bool UploadManager::markRetry(const UploadResult::Retry& retry) {
    // One turn on the store's queue: the count must not be read before and written after another's.
    return deferredStore_->perform([&](Rows& rows) {
        auto found = rows.fetchWhere("identifier", retry.identifier);
        if (found.empty()) return false;
        if (!retry.isCounted) return true;
        auto& entity = found.front();
        ++entity.retries;
        entity.retryAfterDate = retry.after;
        rows.insert(entity);
        return true;
    });
}

void UploadManager::uploadEndedElsewhere(const UploadResult& result) {
    const auto& identifier = result.identifier();
    forgetUnrecorded(identifier);
    if (backlog_.end(identifier)) retryStoredRequestsLater();
    const auto cause = result.cause();
    if (std::holds_alternative<UploadResult::Success>(result.value)) {
        return settle(identifier, Outcome::delivered, cause);
    }
    const bool goesOutAgain = std::holds_alternative<UploadResult::Retry>(result.value) && hasRow(identifier);
    settle(identifier, goesOutAgain ? Outcome::pending : Outcome::givenUp, cause);
}

void UploadManager::uploadDidSend(const std::string& identifier, std::int64_t sent, std::int64_t expected) {
    if (ledger_) ledger_->progress(identifier, sent, expected);
}

void UploadManager::uploadsAreHeldUp(bool lasts) {
    if (ledger_) ledger_->holdUp(lasts);
}

std::shared_ptr<const std::atomic<bool>> UploadManager::progressIsWanted() const noexcept {
    if (!ledger_) return nullptr;
    return {ledger_->news(), &ledger_->news()->isWanted()};
}

bool UploadManager::hasRow(const std::string& identifier) {
    try {
        return deferredStore_->perform([&](Rows& rows) { return !rows.fetchWhere("identifier", identifier).empty(); });
    } catch (...) {
        Log::shared().error("Failed to look for an upload, identifier=%{public}@, error=%{public}@", identifier,
                            AnyError::current().what());
        return true;  // it is there as far as anybody knows
    }
}

void UploadManager::deleteRow(const std::string& identifier) {
    deferredStore_->perform([&](Rows& rows) { rows.deleteWhere("identifier", identifier); });
}

std::optional<AnyError> UploadManager::deleteRows(const std::vector<std::string>& identifiers) noexcept {
    try {
        if (identifiers.size() == 1) {
            deleteRow(identifiers.front());
        } else if (!identifiers.empty()) {
            deferredStore_->perform([&](Rows& rows) {
                rows.transaction([&] {
                    for (const auto& identifier : identifiers) rows.deleteWhere("identifier", identifier);
                });
            });
        }
        return std::nullopt;
    } catch (...) {
        return AnyError::current();
    }
}

void UploadManager::settle(const std::string& identifier, Outcome outcome, const DeliveryUpdate::Cause& cause) {
    if (ledger_) ledger_->settle(identifier, outcome, cause);
}

}  // namespace corvane
