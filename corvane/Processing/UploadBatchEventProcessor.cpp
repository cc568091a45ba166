#include <corvane/Processing/UploadBatchEventProcessor.h>

#include <corvane/Platform/Log.h>
#include <corvane/Platform/Require.h>
#include <corvane/Platform/UUID.h>
#include <corvane/Processing/UserEvents.h>
#include <corvane/Upload/OstrelSigner.h>
#include <corvane/Upload/UploadDropbox.h>
#include <corvane/Upload/UploadManager.h>
#include <corvane/Upload/UploadRequest.h>
#include <corvane/Upload/UploadService.h>

#include <condition_variable>
#include <mutex>
#include <utility>

namespace corvane {

namespace {

std::shared_ptr<UploadManagerType> makeManager(const Endpoint& endpoint, const UploadBatchEventConfig& config,
                                               std::shared_ptr<DeliveryLedger> ledger) {
    return UploadManager::create(std::make_shared<UploadService>(endpoint, std::make_shared<OstrelSigner>()),
                                 std::make_shared<DeferredStore<SignedEntity>>(endpoint.name()),
                                 std::make_shared<UploadDropbox>(endpoint.name(), config.batchDebugging()),
                                 std::move(ledger));
}

/// Waits until the queue has run everything enqueued before, or until the deadline.
void waitForQueue(SerialQueue& queue, std::chrono::steady_clock::time_point deadline) {
    struct Mark {
        std::mutex mutex;
        std::condition_variable reached;
        bool isReached = false;
    };
    const auto mark = std::make_shared<Mark>();
    queue.async([mark] {
        std::lock_guard lock(mark->mutex);
        mark->isReached = true;
        mark->reached.notify_all();
    });
    std::unique_lock lock(mark->mutex);
    mark->reached.wait_until(lock, deadline, [&] { return mark->isReached; });
}

}  // namespace

UploadBatchEventConfig::UploadBatchEventConfig(int batchSize, bool batchDebugging)
    : batchSize_(static_cast<std::size_t>(batchSize)), batchDebugging_(batchDebugging) {
    if (batchSize < 1) throw InvalidArgument("the batch size must be at least 1");
}

const UploadBatchEventConfig& UploadBatchEventConfig::default_() {
    static const UploadBatchEventConfig config;
    return config;
}

UploadBatchEventProcessor::UploadBatchEventProcessor(Client client, const EndpointType& endpoint,
                                                     const UploadBatchEventConfig& config)
    : UploadBatchEventProcessor(std::move(client), Endpoint::copyOf(endpoint), config,
                                std::make_shared<DeliveryLedger>()) {}

UploadBatchEventProcessor::UploadBatchEventProcessor(Client client, const Endpoint& endpoint,
                                                     const UploadBatchEventConfig& config,
                                                     const std::shared_ptr<DeliveryLedger>& ledger)
    : UploadBatchEventProcessor(std::move(client), makeManager(endpoint, config, ledger),
                                std::make_shared<DeferredStore<UploadBatchEntity>>(endpoint.name()), config, ledger) {
    endpointUse_ = std::make_shared<const EndpointUse>(endpoint);
}

UploadBatchEventProcessor::UploadBatchEventProcessor(Client client, std::shared_ptr<UploadManagerType> uploadManager,
                                                     std::shared_ptr<DeferredStore<UploadBatchEntity>> deferredStore,
                                                     const UploadBatchEventConfig& config,
                                                     std::shared_ptr<DeliveryLedger> ledger)
    : client_(std::move(client)),
      ledger_(std::move(ledger)),
      uploadManager_(std::move(uploadManager)),
      deferredStore_(std::move(deferredStore)),
      config_(config) {}

UploadBatchEventProcessor::~UploadBatchEventProcessor() = default;

DeliveryReport UploadBatchEventProcessor::waitForDelivery(std::chrono::steady_clock::time_point deadline) const {
    if (born_.isInChild()) return {};
    DeferredStoreCore::queue().assertNotCurrent("UploadBatchEventProcessor::waitForDelivery");
    std::shared_ptr<SerialQueue> queue;
    {
        std::lock_guard lock(registrationMutex_);
        queue = accessQueue_;
    }
    if (queue) {
        queue->assertNotCurrent("UploadBatchEventProcessor::waitForDelivery");
        waitForQueue(*queue, deadline);
    }
    return ledger_->wait(deadline);
}

void UploadBatchEventProcessor::registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) {
    {
        std::lock_guard lock(registrationMutex_);
        if (accessQueue_ == accessQueue) return;
        if (accessQueue_) throw InvalidArgument("the upload processor belongs to another session manager already");
        accessQueue_ = accessQueue;
    }
    uploadManager_->registerAccessQueue(std::move(accessQueue));
}

void UploadBatchEventProcessor::assertOnQueue(const char* operation) const {
    CORVANE_REQUIRE(accessQueue_ != nullptr, std::string(operation) + " of an upload processor that was never added");
    accessQueue_->assertCurrent(operation);
}

UploadBatchQueueKey UploadBatchEventProcessor::keyOf(const ProcessEvent& processEvent) const {
    if (!currentSession_) throw UploadBatchQueueKeyError(UploadBatchQueueKeyError::invalid);
    const std::string& sessionID = currentSession_->identifier;
    return processEvent.groupName() ? UploadBatchQueueKey::group(sessionID, *processEvent.groupName())
                                    : UploadBatchQueueKey::session(sessionID);
}

void UploadBatchEventProcessor::process(const ProcessEvent& processEvent) {
    assertOnQueue("UploadBatchEventProcessor::process");
    try {
        const UploadBatchQueueKey key = keyOf(processEvent);
        add(key, processEvent.payload());
        if (!key.isGroup()) submit(key, false);
    } catch (...) {
        Log::shared().error("Failed to process event for batching, error=%{public}@", AnyError::current().what());
    }
}

void UploadBatchEventProcessor::add(const UploadBatchQueueKey& key, const JSON& payload) {
    auto found = batchQueues_.find(key);
    if (found == batchQueues_.end()) {
        found = batchQueues_
                    .emplace(key, UploadBatchQueue{newUUID(), currentSession_->sessionData,
                                                   std::make_shared<EncodedEvents>()})
                    .first;
    }
    UploadBatchQueue& queue = found->second;
    queue.events->append(payload);
    queue.session = currentSession_->sessionData;
    if (!backUp(queue)) {
        backupsAreBehind_ = true;
    } else if (backupsAreBehind_) {
        backUpAll();
    }
}

bool UploadBatchEventProcessor::backUp(const UploadBatchQueue& queue) {
    try {
        const UploadBatchEntity backup{queue.identifier, queue.session, queue.events};
        deferredStore_->perform([&](Rows& rows) { rows.insert(backup); });
        return true;
    } catch (...) {
        Log::shared().error("Failed to write queue to disk for backup uploads, identifier=%{public}@, error=%{public}@",
                            queue.identifier, AnyError::current().what());
        return false;
    }
}

void UploadBatchEventProcessor::backUpAll() {
    backupsAreBehind_ = false;
    for (const auto& [key, queue] : batchQueues_) {
        if (!backUp(queue)) backupsAreBehind_ = true;
    }
}

void UploadBatchEventProcessor::submit(const UploadBatchQueueKey& key, bool force) {
    const auto found = batchQueues_.find(key);
    if (found == batchQueues_.end()) return;
    if (!currentSession_) {
        Log::shared().error("Attempting to perform upload without a session");
        return;
    }
    if (key.sessionID() != currentSession_->identifier) {
        Log::shared().error(
            "Attempting to perform upload with session/queue key mismatch, session=%{public}@, queueKey=%{public}@",
            currentSession_->identifier, key.description());
        return;
    }
    if (found->second.events->count() < config_.batchSize() && !force) return;
    try {
        upload(currentSession_->sessionData, found->second.events);
    } catch (...) {
        Log::shared().error("Failed to submit request for upload, error=%{public}@", AnyError::current().what());
        return;
    }
    const std::string identifier = std::move(found->second.identifier);
    batchQueues_.erase(found);
    try {
        deleteRow(identifier);
    } catch (...) {
        Log::shared().error("Failed to clean up request after submission, error=%{public}@",
                            AnyError::current().what());
    }
}

void UploadBatchEventProcessor::upload(const JSON& session, const std::shared_ptr<const EncodedEvents>& events) {
    const auto document = std::make_shared<UserEvents>(session, events, newUUID());
    ledger_->add(document->identifier(), static_cast<std::int64_t>(events->count()));
    try {
        uploadManager_->upload(UploadRequest{client_, document});
    } catch (...) {
        ledger_->remove(document->identifier());
        throw;
    }
}

void UploadBatchEventProcessor::didLeaveGroup(const Group& group) {
    assertOnQueue("UploadBatchEventProcessor::didLeaveGroup");
    if (!currentSession_) {
        Log::shared().error("Attempt to leave group and perform upload without a current session");
        return;
    }
    submit(UploadBatchQueueKey::group(currentSession_->identifier, group.name), true);
}

void UploadBatchEventProcessor::didStartSession(const Session& session) {
    assertOnQueue("UploadBatchEventProcessor::didStartSession");
    try {
        deferredStore_->perform([](Rows& rows) {
            rows.open();
            rows.createTable();
        });
    } catch (...) {
        Log::shared().error("Failed to open handle to the store, error=%{public}@", AnyError::current().what());
    }
    uploadManager_->open();
    currentSession_ = session;
    // What could be neither handed over nor backed up when its session ended, as on a full disk, goes out with the
    // rest.
    backUpAll();
    resubmitTerminated();
}

/// Sends the batches that were open when their process ended.
void UploadBatchEventProcessor::resubmitTerminated() {
    std::vector<UploadBatchEntity> batches;
    try {
        batches = deferredStore_->perform([](Rows& rows) { return rows.fetchAll(); });
    } catch (...) {
        Log::shared().error("Failed to submit rehydrated failed queues, error=%{public}@", AnyError::current().what());
        return;
    }
    for (const auto& batch : batches) resubmit(batch);
}

void UploadBatchEventProcessor::resubmit(const UploadBatchEntity& batch) {
    Log::shared().default_("Attempting to resubmit terminated batch, identifier=%{public}@", batch.identifier);
    try {
        upload(batch.session, batch.events);
    } catch (...) {
        Log::shared().error("Failed to submit rehydrated request for upload, error=%{public}@",
                            AnyError::current().what());
        return;
    }
    // A batch of this run that could not be handed over at its session's end has gone out from its backup just now.
    std::erase_if(batchQueues_, [&](const auto& open) { return open.second.identifier == batch.identifier; });
    try {
        deleteUnlessGrown(batch);
    } catch (...) {
        Log::shared().error("Failed to remove queue from disk, identifier=%{public}@, error=%{public}@",
                            batch.identifier, AnyError::current().what());
    }
}

void UploadBatchEventProcessor::didUpdateSession(const Session& session, bool submitQueues) {
    assertOnQueue("UploadBatchEventProcessor::didUpdateSession");
    if (currentSession_ && submitQueues) submit(UploadBatchQueueKey::session(currentSession_->identifier), true);
    currentSession_ = session;
}

void UploadBatchEventProcessor::didEndSession(const Session&, Date) {
    assertOnQueue("UploadBatchEventProcessor::didEndSession");
    std::vector<UploadBatchQueueKey> keys;
    keys.reserve(batchQueues_.size());
    for (const auto& [key, queue] : batchQueues_) keys.push_back(key);
    for (const auto& key : keys) submit(key, true);
    currentSession_.reset();
    try {
        deferredStore_->perform([](Rows& rows) { rows.close(); });
    } catch (...) {
        Log::shared().error("Failed to close handle to the store, error=%{public}@", AnyError::current().what());
    }
    uploadManager_->close();
}

bool UploadBatchEventProcessor::resumeBackgroundProcessing(const std::string& identifier,
                                                           const std::function<void()>& completion) {
    return uploadManager_->shouldResume(identifier, completion);
}

void UploadBatchEventProcessor::deleteRow(const std::string& identifier) {
    deferredStore_->perform([&](Rows& rows) { rows.deleteWhere("identifier", identifier); });
}

// A row that has grown since it was read belongs to a processor that is at work, in this process or another: the row is
// the only backup of the events that were added, and its owner will send and delete it.
void UploadBatchEventProcessor::deleteUnlessGrown(const UploadBatchEntity& batch) {
    deferredStore_->perform([&](Rows& rows) {
        rows.transaction([&] {
            const auto found = rows.fetchWhere("identifier", batch.identifier);
            const bool hasGrown = !found.empty() && found.front().events->count() > batch.events->count();
            if (!hasGrown) rows.deleteWhere("identifier", batch.identifier);
        });
    });
}

}  // namespace corvane
