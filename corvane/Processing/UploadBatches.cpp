#include <corvane/Processing/UploadBatches.h>

#include <corvane/Platform/HostCall.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/RecordingSwitch.h>
#include <corvane/Platform/Require.h>
#include <corvane/Platform/UUID.h>
#include <corvane/Upload/OstrelSigner.h>
#include <corvane/Upload/UploadDropbox.h>
#include <corvane/Upload/UploadManager.h>
#include <corvane/Upload/UploadService.h>

#include <algorithm>
#include <condition_variable>
#include <utility>

namespace corvane {

namespace {

/// Waits until the queue has run everything enqueued before, or until the deadline.
void waitForQueue(SerialQueue& queue, std::chrono::steady_clock::time_point deadline) {
    struct Mark {
        Mutex mutex;
        std::condition_variable reached;
        bool isReached CORVANE_GUARDED_BY(mutex) = false;
    };
    const auto mark = std::make_shared<Mark>();
    queue.async([mark] {
        const Lock lock(mark->mutex);
        mark->isReached = true;
        mark->reached.notify_all();
    });
    Lock lock(mark->mutex);
    while (!mark->isReached && lock.waitUntil(mark->reached, deadline)) continue;
}

}  // namespace

UploadBatches::UploadBatches(Client client, std::shared_ptr<UploadManagerType> uploadManager,
                             const std::shared_ptr<DeferredStore<UploadBatchEntity>>& deferredStore,
                             const UploadBatchEventConfig& config, std::shared_ptr<DeliveryLedger> ledger,
                             std::shared_ptr<LedgerBook> book, std::shared_ptr<const EndpointUse> endpointUse)
    : ledger_(std::move(ledger)),
      book_(std::move(book)),
      uploadManager_(std::move(uploadManager)),
      deferredStore_(deferredStore),
      config_(config),
      endpointUse_(std::move(endpointUse)),
      documents_(std::move(client), uploadManager_, deferredStore, ledger_),
      terminated_(deferredStore, ledger_),
      counts_(book_) {}

std::shared_ptr<UploadBatches> UploadBatches::make(Client client, const Endpoint& endpoint,
                                                   const UploadBatchEventConfig& config) {
    const auto durability = config.options().durability;
    auto ledger = std::make_shared<DeliveryLedger>();
    auto book = std::make_shared<LedgerBook>();
    auto manager = UploadManager::create(std::make_shared<UploadService>(endpoint, std::make_shared<OstrelSigner>()),
                                         std::make_shared<DeferredStore<SignedEntity>>(endpoint.name(), durability),
                                         std::make_shared<UploadDropbox>(endpoint.name(), config.batchDebugging()),
                                         ledger, book, config.options().retryDelay,
                                         {config.options().maximumBytesOnDisk, config.options().maximumAge});
    return std::make_shared<UploadBatches>(
        std::move(client), std::move(manager),
        std::make_shared<DeferredStore<UploadBatchEntity>>(endpoint.name(), durability), config, std::move(ledger),
        std::move(book), std::make_shared<const EndpointUse>(endpoint));
}

DeliveryReport UploadBatches::waitForDelivery(std::chrono::steady_clock::time_point deadline,
                                              const DeliveryWaitOptions& options) const {
    if (born_.isInChild()) return {};
    DeferredStoreCore::queue().assertNotCurrent("UploadBatchEventProcessor::waitForDelivery");
    const auto queue = registeredQueue();
    if (queue) {
        queue->assertNotCurrent("UploadBatchEventProcessor::waitForDelivery");
        waitForQueue(*queue, deadline);
    }
    const auto report = ledger_->wait(deadline, options.onlyWhileReachable);
    // What is settled inside a callback is acknowledged behind it: a host that exits now must not be told again.
    if (queue) waitForQueue(*queue, deadline);
    return report;
}

void UploadBatches::flush() {
    const auto queue = registeredQueue();
    if (!queue || born_.isInChild()) return;
    queue->async([self = shared_from_this()] {
        self->assertOnQueue("UploadBatchEventProcessor::flush");
        self->handOverSession();
    });
}

void UploadBatches::handOverSession() {
    if (currentSession_) handOver(UploadBatchQueueKey::session(currentSession_->identifier), true);
}

// The row of a batch goes with the transaction that writes its document's, and the system may write that to the disk
// before the document's payload. What has only just been acknowledged may be lost anyway: its document is not waited
// for, so that a host that records much waits for the disk once in a while, and not for each document.
Durability UploadBatches::durabilityOf(const UploadBatch& batch) const {
    constexpr std::chrono::seconds isOld(1);
    const bool holdsOld = UploadBatch::Clock::now() - batch.begin() >= isOld;
    return holdsOld ? Durability::powerCut : config_.options().durability;
}

std::shared_ptr<SerialQueue> UploadBatches::registeredQueue() const {
    const Lock lock(registrationMutex_);
    return accessQueue_;
}

void UploadBatches::registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) {
    {
        const Lock lock(registrationMutex_);
        if (accessQueue_ == accessQueue) return;
        if (accessQueue_) throw InvalidArgument("the upload processor belongs to another session manager already");
        accessQueue_ = accessQueue;
    }
    uploadManager_->registerAccessQueue(std::move(accessQueue));
}

void UploadBatches::assertOnQueue(const char* operation) const {
    CORVANE_REQUIRE(accessQueue_ != nullptr, std::string(operation) + " of an upload processor that was never added");
    accessQueue_->assertCurrent(operation);
}

UploadBatchQueueKey UploadBatches::keyOf(const ProcessEvent& processEvent) const {
    if (!currentSession_) throw UploadBatchQueueKeyError(UploadBatchQueueKeyError::invalid);
    const std::string& sessionID = currentSession_->identifier;
    return processEvent.groupName() ? UploadBatchQueueKey::group(sessionID, *processEvent.groupName())
                                    : UploadBatchQueueKey::session(sessionID);
}

void UploadBatches::process(const ProcessEvent& processEvent) {
    assertOnQueue("UploadBatchEventProcessor::process");
    // With the first of a run: what comes after another process has forgotten is no part of what that was about.
    if (!writesAtEndOfRun_) RecordingSwitch::look();
    dropForgotten();
    counts_.accept();
    try {
        const UploadBatchQueueKey key = keyOf(processEvent);
        add(key, processEvent.payload());
        if (!key.isGroup()) {
            handOver(key, false);
            limitDelay();
        }
    } catch (...) {
        Log::shared().error("Failed to process event for batching, error=%{public}@", AnyError::current().what());
    }
}

void UploadBatches::limitDelay() {
    const auto& delay = config_.options().maximumDelay;
    if (!delay || delayTimer_.isSet() || !currentSession_) return;
    if (!batchQueues_.contains(UploadBatchQueueKey::session(currentSession_->identifier))) return;
    delayTimer_ = Timer::after(*accessQueue_, *delay, [weak = weak_from_this()] {
        const auto self = weak.lock();
        if (!self) return;
        self->assertOnQueue("UploadBatchEventProcessor::handOverSession");
        self->handOverSession();
    });
}

void UploadBatches::add(const UploadBatchQueueKey& key, const JSON& payload) {
    if (const auto found = batchQueues_.find(key); found != batchQueues_.end()) {
        found->second.append(payload, currentSession_->sessionData);
    } else {
        UploadBatch batch;
        batch.append(payload, currentSession_->sessionData);
        batchQueues_.emplace(key, std::move(batch));
    }
    writeAtEndOfRun();
}

void UploadBatches::writeAtEndOfRun() {
    if (writesAtEndOfRun_) return;
    accessQueue_->atEndOfRun(SerialQueue::RunEnd::write, [self = shared_from_this()] {
        self->assertOnQueue("UploadBatchEventProcessor::writeChanged");
        self->writeChanged();
    });
    writesAtEndOfRun_ = true;
}

void UploadBatches::writeChanged() {
    writesAtEndOfRun_ = false;
    bool isWritten = true;
    for (auto& [key, batch] : batchQueues_) {
        for (auto& part : batch.parts()) {
            if (part.isDue && !backUp(part)) isWritten = false;
        }
    }
    if (dropForgotten()) return;
    if (!isWritten) {
        backupsAreBehind_ = true;
    } else if (backupsAreBehind_) {
        backUpAll();
    }
    publish();
}

bool UploadBatches::backUp(UploadBatch::Part& part) {
    part.isDue = part.isBackedUp = false;
    part.hasRow = true;  // also when it fails: it may be there from before
    try {
        const UploadBatchEntity backup{part.identifier, part.session, part.events};
        deferredStore_->change([&, epoch = epoch_](Rows& rows) {
            part.isBackedUp = RecordingSwitch::epoch() <= epoch;
            if (part.isBackedUp) rows.insert(backup);
        });
        if (part.isBackedUp) part.saved = part.events->count();
    } catch (...) {
        part.isBackedUp = false;
        Log::shared().error("Failed to write queue to disk for backup uploads, identifier=%{public}@, error=%{public}@",
                            part.identifier, AnyError::current().what());
    }
    return part.isBackedUp;
}

bool UploadBatches::backUp(UploadBatch& batch) {
    bool isWritten = true;
    for (auto& part : batch.parts()) {
        if (!backUp(part)) isWritten = false;
    }
    return isWritten;
}

void UploadBatches::backUpAll() {
    backupsAreBehind_ = false;
    dropDelivered();
    for (auto one = unsaved_.begin(); one != unsaved_.end();) {
        const bool isSaved = backUp(one->second);
        if (isSaved) {
            ledger_->unfollow(one->first);
            counts_.leave(one->second);
        }
        one = isSaved ? unsaved_.erase(one) : std::next(one);
    }
    for (auto& [key, queue] : batchQueues_) {
        if (!backUp(queue)) backupsAreBehind_ = true;
    }
    if (dropForgotten()) return;
    if (!unsaved_.empty()) backupsAreBehind_ = true;
}

void UploadBatches::handOver(const UploadBatchQueueKey& key, bool force) {
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
    if (found->second.count() < config_.batchSize() && !force) return;
    // A manager of the host's may submit events from inside its call: they go into a batch of their own.
    auto handedOver = batchQueues_.extract(found);
    if (!key.isGroup()) delayTimer_.cancel();
    try {
        if (!tryHandOver(handedOver.mapped())) {
            putBack(std::move(handedOver));
            dropForgotten();
        }
        publish();
    } catch (...) {
        Log::shared().error("Failed to submit request for upload, error=%{public}@", AnyError::current().what());
        putBack(std::move(handedOver));
    }
}

bool UploadBatches::tryHandOver(UploadBatch& batch) {
    DocumentHandOver::Contents contents{currentSession_->sessionData, {}, {}, epoch_, durabilityOf(batch)};
    for (const auto& part : batch.parts()) {
        contents.events.push_back(part.events);
        if (part.hasRow) contents.rows.push_back(part.identifier);
    }
    const auto removal = documents_.handOver(contents, {});
    if (removal.error) {
        Log::shared().error("Failed to clean up request after submission, error=%{public}@", removal.error->what());
    }
    if (removal.taken == UploadTaken::forgotten) return false;
    if (removal.taken == UploadTaken::underWay || removal.isKept) {
        keep(batch, removal.document);
    } else {
        counts_.handOver(batch);
    }
    return true;
}

void UploadBatches::keep(UploadBatch& batch, const std::string& document) {
    if (batch.isBackedUp() || backUp(batch)) return counts_.leave(batch);
    dropDelivered();
    if (!ledger_->follow(document)) return counts_.leave(batch);
    unsaved_.emplace(document, std::move(batch));
    backupsAreBehind_ = true;
}

void UploadBatches::dropDelivered() {
    for (auto one = unsaved_.begin(); one != unsaved_.end();) {
        const auto settled = ledger_->takeOutcome(one->first);
        if (!settled || settled->outcome == DeliveryLedger::Outcome::pending) {
            ++one;
            continue;
        }
        counts_.settle(one->second, *settled);
        one = unsaved_.erase(one);
    }
}

void UploadBatches::putBack(Queues::node_type refused) {
    auto back = batchQueues_.insert(std::move(refused));
    if (!back.inserted) back.position->second.prepend(std::move(back.node.mapped()));
    writeAtEndOfRun();
    limitDelay();  // it is tried again then, if no event tries before
}

void UploadBatches::didLeaveGroup(const Group& group) {
    assertOnQueue("UploadBatchEventProcessor::didLeaveGroup");
    if (!currentSession_) {
        Log::shared().error("Attempt to leave group and perform upload without a current session");
        return;
    }
    handOver(UploadBatchQueueKey::group(currentSession_->identifier, group.name), true);
}

void UploadBatches::didStartSession(const Session& session) {
    assertOnQueue("UploadBatchEventProcessor::didStartSession");
    try {
        deferredStore_->perform([](Rows& rows) {
            rows.open();
            rows.createTable();
        });
    } catch (...) {
        Log::shared().error("Failed to open handle to the store, error=%{public}@", AnyError::current().what());
    }
    dropForgotten();  // the manager sends what is stored: that is none of it
    uploadManager_->open();
    delayTimer_.cancel();
    setSession(session);
    // What could be neither handed over nor backed up when its session ended, as on a full disk, goes out with the
    // rest.
    backUpAll();
    terminated_.list();
    constexpr std::size_t few = 64;
    if (terminated_.count() > few) {
        accessQueue_->async([self = shared_from_this()] {
            self->assertOnQueue("UploadBatchEventProcessor::readStored");
            self->readStored();
        });
    } else {
        readStored();
    }
    handOverTerminated();
}

void UploadBatches::handOverTerminated() {
    constexpr std::size_t atOnce = std::size_t{256} * 1024;
    const auto self = weak_from_this();
    for (std::size_t bytes = 0; !terminated_.isEmpty() && (bytes < atOnce || self.expired());) {
        bytes += terminated_.sendNext([this](UploadBatchEntity batch) {
            assertOnQueue("UploadBatchEventProcessor::handOverTerminated");
            handOverTerminated(std::move(batch));
        });
    }
    if (terminated_.isEmpty()) return;
    accessQueue_->async([self] {
        const auto batches = self.lock();
        if (!batches) return;
        batches->assertOnQueue("UploadBatchEventProcessor::handOverTerminated");
        batches->handOverTerminated();
    });
}

void UploadBatches::handOverTerminated(UploadBatchEntity batch) {
    Log::shared().default_("Attempting to resubmit terminated batch, identifier=%{public}@", batch.identifier);
    // A part of a batch of this run that could not be handed over at its session's end. Its row may be behind: then the
    // part itself goes out.
    const auto found = std::find_if(batchQueues_.begin(), batchQueues_.end(),
                                    [&](auto& one) { return one.second.find(batch.identifier) != nullptr; });
    UploadBatch::Part* const open = found == batchQueues_.end() ? nullptr : found->second.find(batch.identifier);
    if (open && open->events->count() > batch.events->count()) {
        batch.session = open->session;
        batch.events = open->events;
    }
    // A row that has grown since it was read belongs to a processor that is at work, in this process or another: the
    // row is the only backup of the events that were added, and its owner will send and delete it.
    const auto hasNotGrown = [&](Rows& rows) {
        const auto now = rows.fetchWhere("identifier", batch.identifier);
        return now.empty() || now.front().events->count() <= batch.events->count();
    };
    DocumentHandOver::Removal removal;
    try {
        removal = documents_.handOver({batch.session, {batch.events}, {batch.identifier}, epoch_, Durability::powerCut},
                                      hasNotGrown);
        if (removal.taken == UploadTaken::forgotten) return;
        if (removal.error) {
            Log::shared().error("Failed to remove queue from disk, identifier=%{public}@, error=%{public}@",
                                batch.identifier, removal.error->what());
        }
    } catch (...) {
        Log::shared().error("Failed to submit rehydrated request for upload, error=%{public}@",
                            AnyError::current().what());
        return;
    }
    takeOut(batch, removal);
}

// The manager may be the host's, whose code may have changed the batches meanwhile.
void UploadBatches::takeOut(const UploadBatchEntity& batch, const DocumentHandOver::Removal& removal) {
    for (auto queue = batchQueues_.begin(); queue != batchQueues_.end(); ++queue) {
        UploadBatch handedOver = queue->second.take(batch.identifier);
        if (handedOver.isEmpty()) continue;
        if (queue->second.isEmpty()) batchQueues_.erase(queue);
        if (removal.taken == UploadTaken::underWay) {
            keep(handedOver, removal.document);
        } else {
            counts_.handOver(handedOver);
        }
        return publish();
    }
    const bool isGone = removal.taken == UploadTaken::recorded && !removal.isKept && !removal.error;
    if (isGone) counts_.handOver(batch);
}

void UploadBatches::didUpdateSession(const Session& session, bool submitQueues) {
    assertOnQueue("UploadBatchEventProcessor::didUpdateSession");
    if (submitQueues) handOverSession();
    setSession(session);
}

// What is no object, which only a caller of the host's own can hand over, would make every document of the session
// unreadable.
void UploadBatches::setSession(const Session& session) {
    assertOnQueue("UploadBatchEventProcessor::setSession");
    currentSession_ = session;
    if (session.sessionData.isObject()) return;
    Log::shared().error("Session data is not a JSON object and is left out, identifier=%{public}@", session.identifier);
    currentSession_->sessionData = JSON("{}");
}

void UploadBatches::didEndSession() {
    assertOnQueue("UploadBatchEventProcessor::didEndSession");
    std::vector<UploadBatchQueueKey> keys;
    keys.reserve(batchQueues_.size());
    for (const auto& [key, queue] : batchQueues_) keys.push_back(key);
    for (const auto& key : keys) handOver(key, true);
    currentSession_.reset();
    delayTimer_.cancel();
    try {
        deferredStore_->perform([](Rows& rows) { rows.close(); });
    } catch (...) {
        Log::shared().error("Failed to close handle to the store, error=%{public}@", AnyError::current().what());
    }
    uploadManager_->close();
}

void UploadBatches::didReject(RejectedEvent::Reason reason) {
    assertOnQueue("UploadBatchEventProcessor::didReject");
    counts_.reject(reason);
}

std::optional<ForgottenRecords> UploadBatches::dropForgotten() {
    const auto epoch = RecordingSwitch::epoch();
    if (epoch <= epoch_) return std::nullopt;
    if (std::exchange(epoch_, epoch) == noEpoch) return std::nullopt;
    const bool hasRows = DeferredStoreCore::queue().sync([this] { return !deferredStore_->isInMemory(); });
    ForgottenRecords unsaved;
    for (const auto& [key, batch] : batchQueues_) unsaved.events += counts_.forget(batch, hasRows);
    for (const auto& [document, batch] : unsaved_) {
        unsaved.events += counts_.forget(batch, hasRows);
        ledger_->unfollow(document);
    }
    batchQueues_.clear();
    delayTimer_.cancel();
    unsaved_.clear();
    terminated_.clear();
    backupsAreBehind_ = false;
    uploadManager_->forget();
    readStored();
    publish();
    return unsaved;
}

ForgottenRecords UploadBatches::forget() {
    assertOnQueue("UploadBatchEventProcessor::forget");
    return dropForgotten().value_or(ForgottenRecords());
}

bool UploadBatches::isOpen(const std::string& identifier) {
    assertOnQueue("UploadBatchEventProcessor::isOpen");
    const auto has = [&](auto& one) { return one.second.find(identifier) != nullptr; };
    return std::any_of(batchQueues_.begin(), batchQueues_.end(), has) ||
           std::any_of(unsaved_.begin(), unsaved_.end(), has);
}

void UploadBatches::readStored() {
    try {
        std::vector<UploadBatchEntity::Size> others;
        for (auto& row :
             deferredStore_->perform([](Rows& rows) { return UploadBatchEntity::sizes(*rows.connection()); })) {
            if (!isOpen(row.identifier)) others.push_back(std::move(row));
        }
        counts_.setOthers(others);
        uploadManager_->readLedger();  // behind the rows of batches, which are forgotten into the ledger
    } catch (...) {
        Log::shared().error("Failed to read the ledger, error=%{public}@", AnyError::current().what());
    }
}

void UploadBatches::publish() {
    BatchCounts::Publication publication(counts_);
    for (const auto& [key, batch] : batchQueues_) publication.add(batch);
    for (const auto& [document, batch] : unsaved_) publication.add(batch);
}

void UploadBatches::readLedger(std::function<void(const Ledger&)> completion) {
    const auto queue = registeredQueue();
    if (!queue || born_.isInChild()) return;
    queue->async([self = shared_from_this(), completion = std::move(completion)] {
        self->assertOnQueue("UploadBatchEventProcessor::readLedger");
        self->readStored();
        self->dropForgotten();  // as far as is known by now
        if (completion) callHost("ledger completion", [&] { completion(self->ledger()); });
    });
}

bool UploadBatches::resumeBackgroundProcessing(const std::string& identifier, const std::function<void()>& completion) {
    return uploadManager_->shouldResume(identifier, completion);
}

}  // namespace corvane
