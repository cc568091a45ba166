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

#include <algorithm>
#include <condition_variable>
#include <mutex>
#include <set>
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
    const auto report = ledger_->wait(deadline);
    // What is settled inside a callback is acknowledged behind it: a host that exits now must not be told again.
    if (queue) waitForQueue(*queue, deadline);
    return report;
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
                    .emplace(key, UploadBatchQueue{.identifier = newUUID(),
                                                   .session = currentSession_->sessionData,
                                                   .events = std::make_shared<EncodedEvents>()})
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

bool UploadBatchEventProcessor::backUp(UploadBatchQueue& queue) {
    queue.isBackedUp = false;
    try {
        const UploadBatchEntity backup{queue.identifier, queue.session, queue.events};
        deferredStore_->perform([&](Rows& rows) { rows.insert(backup); });
        queue.isBackedUp = true;
    } catch (...) {
        Log::shared().error("Failed to write queue to disk for backup uploads, identifier=%{public}@, error=%{public}@",
                            queue.identifier, AnyError::current().what());
    }
    return queue.isBackedUp;
}

void UploadBatchEventProcessor::backUpAll() {
    backupsAreBehind_ = false;
    dropDelivered();
    for (auto one = unsaved_.begin(); one != unsaved_.end();) {
        const bool isSaved = backUp(one->second);
        if (isSaved) ledger_->unfollow(one->first);
        one = isSaved ? unsaved_.erase(one) : std::next(one);
    }
    for (auto& [key, queue] : batchQueues_) {
        if (!backUp(queue)) backupsAreBehind_ = true;
    }
    if (!unsaved_.empty()) backupsAreBehind_ = true;
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
    // A manager of the host's may submit events from inside its call: they go into a batch of their own.
    auto handedOver = batchQueues_.extract(found);
    try {
        handOver(handedOver.mapped());
    } catch (...) {
        Log::shared().error("Failed to submit request for upload, error=%{public}@", AnyError::current().what());
        putBack(std::move(handedOver));
    }
}

void UploadBatchEventProcessor::handOver(UploadBatchQueue& queue) {
    const auto removal = upload(queue.identifier, currentSession_->sessionData, queue.events, {});
    if (removal.error) {
        Log::shared().error("Failed to clean up request after submission, error=%{public}@", removal.error->what());
    }
    if (removal.taken == UploadTaken::underWay) keep(queue, removal.document);
}

void UploadBatchEventProcessor::keep(UploadBatchQueue& queue, const std::string& document) {
    if (queue.isBackedUp || backUp(queue)) return;
    dropDelivered();
    if (!ledger_->follow(document)) return;
    unsaved_.emplace(document, std::move(queue));
    backupsAreBehind_ = true;
}

void UploadBatchEventProcessor::dropDelivered() {
    std::erase_if(unsaved_, [this](const auto& one) {
        const auto outcome = ledger_->takeOutcome(one.first);
        return outcome && *outcome != DeliveryLedger::Outcome::pending;
    });
}

void UploadBatchEventProcessor::putBack(Queues::node_type refused) {
    const auto back = batchQueues_.insert(std::move(refused));
    if (back.inserted) return;
    UploadBatchQueue& successor = back.position->second;
    UploadBatchQueue& queue = back.node.mapped();
    queue.events->append(*successor.events);
    std::swap(queue.identifier, successor.identifier);
    std::swap(queue.events, successor.events);
    if (!backUp(successor)) {
        backupsAreBehind_ = true;
        return;
    }
    try {
        deferredStore_->perform([&](Rows& rows) { rows.deleteWhere("identifier", queue.identifier); });
    } catch (...) {
        Log::shared().error("Failed to remove queue from disk, identifier=%{public}@, error=%{public}@",
                            queue.identifier, AnyError::current().what());
    }
}

UploadBatchEventProcessor::Removal UploadBatchEventProcessor::upload(const std::string& identifier, const JSON& session,
                                                                     const std::shared_ptr<const EncodedEvents>& events,
                                                                     const MayDelete& mayDelete) {
    const auto document = std::make_shared<UserEvents>(session, events, newUUID());
    Removal removal;
    ledger_->add(document->identifier(), static_cast<std::int64_t>(events->count()));
    try {
        UploadRequest request{client_, document};
        request.removeBackup = [&](const std::shared_ptr<StoreConnection>& connection) {
            removeBackup(connection, identifier, mayDelete, removal);
        };
        removal.taken = uploadManager_->upload(request);
    } catch (...) {
        ledger_->remove(document->identifier());
        throw;
    }
    removal.document = document->identifier();
    if (removal.taken == UploadTaken::underWay) {  // what the transaction did is undone
        return {.document = std::move(removal.document), .error = std::nullopt};
    }
    if (removal.isKept || removal.isDone || removal.error) return removal;
    try {
        deferredStore_->perform([&](Rows& rows) { rows.transaction([&] { deleteRow(rows, identifier, mayDelete); }); });
    } catch (...) {
        removal.error = AnyError::current();
    }
    return removal;
}

// Only where both tables are in one file; otherwise the row is deleted afterwards, and a kill in between sends it
// again.
void UploadBatchEventProcessor::removeBackup(const std::shared_ptr<StoreConnection>& connection,
                                             const std::string& identifier, const MayDelete& mayDelete,
                                             Removal& removal) {
    removal.isKept = connection->location().isMemory() && !deferredStore_->isInMemory();
    if (!deferredStore_->sharesFileWith(*connection)) return;
    try {
        Rows rows(connection);
        deleteRow(rows, identifier, mayDelete);
        removal.isDone = true;
    } catch (...) {
        removal.error = AnyError::current();
    }
}

void UploadBatchEventProcessor::deleteRow(Rows& rows, const std::string& identifier, const MayDelete& mayDelete) {
    if (!mayDelete || mayDelete(rows)) rows.deleteWhere("identifier", identifier);
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
    setSession(session);
    // What could be neither handed over nor backed up when its session ended, as on a full disk, goes out with the
    // rest.
    backUpAll();
    listTerminated();
    resubmitTerminated();
}

void UploadBatchEventProcessor::listTerminated() {
    std::vector<std::string> identifiers;
    try {
        identifiers = deferredStore_->perform([](Rows& rows) { return rows.keys(); });
    } catch (...) {
        Log::shared().error("Failed to submit rehydrated failed queues, error=%{public}@", AnyError::current().what());
        return;
    }
    const std::set<std::string> listed(terminated_.begin(), terminated_.end());
    for (auto& identifier : identifiers) {
        if (listed.contains(identifier)) continue;
        ledger_->resubmitted(identifier);
        terminated_.push_back(std::move(identifier));
    }
}

void UploadBatchEventProcessor::resubmitTerminated() {
    constexpr std::size_t atOnce = std::size_t{256} * 1024;
    const auto self = weak_from_this();
    for (std::size_t bytes = 0; !terminated_.empty() && (bytes < atOnce || self.expired());) {
        const std::string identifier = std::move(terminated_.front());
        terminated_.pop_front();
        bytes += resubmit(identifier);
        ledger_->remove(identifier);  // its document is there in its place
    }
    if (terminated_.empty()) return;
    accessQueue_->async([self] {
        const auto processor = self.lock();
        if (!processor) return;
        processor->assertOnQueue("UploadBatchEventProcessor::resubmitTerminated");
        processor->resubmitTerminated();
    });
}

// One at a time: rows are as large as the groups that they hold.
std::size_t UploadBatchEventProcessor::resubmit(const std::string& identifier) {
    std::vector<UploadBatchEntity> found;
    try {
        found = deferredStore_->perform([&](Rows& rows) { return rows.fetchWhere("identifier", identifier); });
    } catch (...) {
        Log::shared().error("Failed to submit rehydrated failed queues, error=%{public}@",
                            identifier + ": " + AnyError::current().what());
    }
    if (found.empty()) return 0;  // unreadable, or sent by another process meanwhile
    const std::size_t size = found.front().events->text().size();
    resubmit(std::move(found.front()));
    return size;
}

void UploadBatchEventProcessor::resubmit(UploadBatchEntity batch) {
    Log::shared().default_("Attempting to resubmit terminated batch, identifier=%{public}@", batch.identifier);
    // A batch of this run that could not be handed over at its session's end. Its row may be behind: then the batch
    // itself goes out.
    const std::size_t stored = batch.events->count();
    const auto isThis = [&](const auto& one) { return one.second.identifier == batch.identifier; };
    auto open = std::find_if(batchQueues_.begin(), batchQueues_.end(), isThis);
    if (open != batchQueues_.end() && open->second.events->count() > stored) {
        batch.session = open->second.session;
        batch.events = open->second.events;
    }
    // A row that has grown since it was read belongs to a processor that is at work, in this process or another: the
    // row is the only backup of the events that were added, and its owner will send and delete it.
    const auto hasNotGrown = [&](Rows& rows) {
        const auto now = rows.fetchWhere("identifier", batch.identifier);
        return now.empty() || now.front().events->count() <= batch.events->count();
    };
    Removal removal;
    try {
        removal = upload(batch.identifier, batch.session, batch.events, hasNotGrown);
        if (removal.error) {
            Log::shared().error("Failed to remove queue from disk, identifier=%{public}@, error=%{public}@",
                                batch.identifier, removal.error->what());
        }
    } catch (...) {
        Log::shared().error("Failed to submit rehydrated request for upload, error=%{public}@",
                            AnyError::current().what());
        return;
    }
    open = std::find_if(batchQueues_.begin(), batchQueues_.end(), isThis);
    if (open == batchQueues_.end()) return;
    auto handedOver = batchQueues_.extract(open);
    if (removal.taken == UploadTaken::underWay) keep(handedOver.mapped(), removal.document);
}

void UploadBatchEventProcessor::didUpdateSession(const Session& session, bool submitQueues) {
    assertOnQueue("UploadBatchEventProcessor::didUpdateSession");
    if (currentSession_ && submitQueues) submit(UploadBatchQueueKey::session(currentSession_->identifier), true);
    setSession(session);
}

// What is no object, which only a caller of the host's own can hand over, would make every document of the session
// unreadable.
void UploadBatchEventProcessor::setSession(const Session& session) {
    assertOnQueue("UploadBatchEventProcessor::setSession");
    currentSession_ = session;
    if (session.sessionData.isObject()) return;
    Log::shared().error("Session data is not a JSON object and is left out, identifier=%{public}@", session.identifier);
    currentSession_->sessionData = JSON("{}");
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

}  // namespace corvane
