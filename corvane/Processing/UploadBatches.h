#pragma once

#include <corvane/Models/Client.h>
#include <corvane/Models/ProcessEvent.h>
#include <corvane/Models/Session.h>
#include <corvane/Platform/ForkMark.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Platform/Timer.h>
#include <corvane/Processing/BatchCounts.h>
#include <corvane/Processing/DocumentHandOver.h>
#include <corvane/Processing/TerminatedBatches.h>
#include <corvane/Processing/UploadBatch.h>
#include <corvane/Processing/UploadBatchEntity.h>
#include <corvane/Processing/UploadBatchEventProcessor.h>
#include <corvane/Processing/UploadBatchQueueKey.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Upload/DeliveryLedger.h>
#include <corvane/Upload/EndpointUse.h>
#include <corvane/Upload/LedgerBook.h>
#include <corvane/Upload/UploadManagerType.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace corvane {

/// The open batches of an `UploadBatchEventProcessor`, which owns them: what it says of itself holds for them.
///
/// A batch is open (in `batchQueues_`, from the end of the run with rows that hold all its events unless
/// `backupsAreBehind_`), then handed over, and its rows go in the transaction that writes the document's row; one that
/// fills up within a run never had any. Refused, it is open again. Where neither
/// row can be written while the document is under way, it stays in `unsaved_` until one can be, or until the document
/// has got through. Rows of an earlier run are in `terminated_` until they are handed over in their turn. Internal.
class UploadBatches : public std::enable_shared_from_this<UploadBatches> {
  public:
    /// Works with an upload manager and a store of the caller's. `ledger` and `book` are those that the manager keeps.
    UploadBatches(Client client, std::shared_ptr<UploadManagerType> uploadManager,
                  const std::shared_ptr<DeferredStore<UploadBatchEntity>>& deferredStore,
                  const UploadBatchEventConfig& config, std::shared_ptr<DeliveryLedger> ledger,
                  std::shared_ptr<LedgerBook> book = std::make_shared<LedgerBook>(),
                  std::shared_ptr<const EndpointUse> endpointUse = nullptr);

    /// The library's own set-up for an endpoint.
    [[nodiscard]] static std::shared_ptr<UploadBatches> make(Client client, const Endpoint& endpoint,
                                                             const UploadBatchEventConfig& config);

    DeliveryReport waitForDelivery(std::chrono::steady_clock::time_point deadline,
                                   const DeliveryWaitOptions& options) const;
    void flush();
    void setDeliveryObserver(DeliveryObserver observer) { ledger_->news()->setObserver(std::move(observer)); }
    [[nodiscard]] Ledger ledger() const { return book_->ledger(); }
    void readLedger(std::function<void(const Ledger&)> completion);
    void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue);
    bool resumeBackgroundProcessing(const std::string& identifier, const std::function<void()>& completion);

    // On the access queue (the process is stopped with a message).
    void process(const ProcessEvent& processEvent);
    void didLeaveGroup(const Group& group);
    void didStartSession(const Session& session);
    void didUpdateSession(const Session& session, bool submitQueues);
    void didEndSession();
    void didReject(RejectedEvent::Reason reason);
    ForgottenRecords forget();

  private:
    using Rows = Store<UploadBatchEntity>;

    using Queues = std::map<UploadBatchQueueKey, UploadBatch>;

    void assertOnQueue(const char* operation) const CORVANE_ASSERT_CAPABILITY(*accessQueue_);
    /// The queue that was registered, from any thread; nullptr before.
    [[nodiscard]] std::shared_ptr<SerialQueue> registeredQueue() const;
    void setSession(const Session& session) CORVANE_REQUIRES(*accessQueue_);
    [[nodiscard]] UploadBatchQueueKey keyOf(const ProcessEvent& processEvent) const CORVANE_REQUIRES(*accessQueue_);

    /// Appends an event to its batch, which is made if need be. Its row is written at the end of the run.
    void add(const UploadBatchQueueKey& key, const JSON& payload) CORVANE_REQUIRES(*accessQueue_);
    /// Has the rows written whose batches have changed, once for a run.
    void writeAtEndOfRun() CORVANE_REQUIRES(*accessQueue_);
    void writeChanged() CORVANE_REQUIRES(*accessQueue_);
    /// Writes a part's row. Returns whether it is written; if not, that has been logged, or it is forgotten.
    bool backUp(UploadBatch::Part& part) CORVANE_REQUIRES(*accessQueue_);
    /// Writes the rows of all parts, and returns whether all are written.
    bool backUp(UploadBatch& batch) CORVANE_REQUIRES(*accessQueue_);
    /// Writes the rows of all batches, after one could not be written.
    void backUpAll() CORVANE_REQUIRES(*accessQueue_);
    /// Lets go of unsaved batches whose documents need no second attempt.
    void dropDelivered() CORVANE_REQUIRES(*accessQueue_);

    /// Sees to it that the session's open batch, if there is one, is handed over when `maximumDelay` has passed.
    void limitDelay() CORVANE_REQUIRES(*accessQueue_);
    /// What a batch's payload must survive before its rows go.
    [[nodiscard]] Durability durabilityOf(const UploadBatch& batch) const;
    void handOverSession() CORVANE_REQUIRES(*accessQueue_);
    /// Hands a batch over when it is full, or in any case; one that is refused is open again.
    void handOver(const UploadBatchQueueKey& key, bool force) CORVANE_REQUIRES(*accessQueue_);
    /// Hands a batch over that is in no list any more, with the session's data as it is now.
    /// Throws what the manager throws; the batch is then as it was. Returns false, and it is, when it is forgotten.
    [[nodiscard]] bool tryHandOver(UploadBatch& batch) CORVANE_REQUIRES(*accessQueue_);
    /// Sees to it that a batch whose document is under way without a row of its own stays in its backup.
    void keep(UploadBatch& batch, const std::string& document) CORVANE_REQUIRES(*accessQueue_);
    /// Puts a batch back that was refused, before what was added to its successor meanwhile.
    void putBack(Queues::node_type refused) CORVANE_REQUIRES(*accessQueue_);

    /// Sends some of the terminated batches, and goes on later, behind what waits on the queue.
    void handOverTerminated() CORVANE_REQUIRES(*accessQueue_);
    /// Sends one as its row holds it, or as it is open here if that has more.
    void handOverTerminated(UploadBatchEntity batch) CORVANE_REQUIRES(*accessQueue_);
    /// Takes a part that was handed over by its row out of its open batch, if it is in one.
    void takeOut(const UploadBatchEntity& batch, const DocumentHandOver::Removal& removal)
        CORVANE_REQUIRES(*accessQueue_);

    /// Drops all that is here when everything is to be forgotten that was recorded before now. Returns what of it was
    /// in no row; nothing when there is nothing to forget.
    std::optional<ForgottenRecords> dropForgotten() CORVANE_REQUIRES(*accessQueue_);
    /// Whether a row's batch is one of those here.
    [[nodiscard]] bool isOpen(const std::string& identifier) CORVANE_REQUIRES(*accessQueue_);
    /// Reads what is on disk into the book, rows of earlier runs and other processes among it. Logs what fails.
    void readStored() CORVANE_REQUIRES(*accessQueue_);
    /// Tells the book what is here.
    void publish() CORVANE_REQUIRES(*accessQueue_);

    // Constant after construction.
    const std::shared_ptr<DeliveryLedger> ledger_;
    const std::shared_ptr<LedgerBook> book_;
    const std::shared_ptr<UploadManagerType> uploadManager_;
    const std::shared_ptr<DeferredStore<UploadBatchEntity>> deferredStore_;
    const UploadBatchEventConfig config_;
    const std::shared_ptr<const EndpointUse> endpointUse_;  // nothing with a manager of the caller's
    const ForkMark born_;

    // Set once, before the first callback: the queue's own tasks read it without the mutex.
    mutable Mutex registrationMutex_;
    std::shared_ptr<SerialQueue> accessQueue_;

    DocumentHandOver documents_ CORVANE_GUARDED_BY(*accessQueue_);
    Queues batchQueues_ CORVANE_GUARDED_BY(*accessQueue_);
    // By document.
    std::map<std::string, UploadBatch> unsaved_ CORVANE_GUARDED_BY(*accessQueue_);
    TerminatedBatches terminated_ CORVANE_GUARDED_BY(*accessQueue_);
    std::optional<Session> currentSession_ CORVANE_GUARDED_BY(*accessQueue_);
    Timer delayTimer_ CORVANE_GUARDED_BY(*accessQueue_);  // of the session's batch; set while there is one
    // A row could not be written; once one can, all are.
    bool backupsAreBehind_ CORVANE_GUARDED_BY(*accessQueue_) = false;
    bool writesAtEndOfRun_ CORVANE_GUARDED_BY(*accessQueue_) = false;
    // In which all that is here was recorded; none as long as nothing can be.
    static constexpr std::int64_t noEpoch = -1;
    std::int64_t epoch_ CORVANE_GUARDED_BY(*accessQueue_) = noEpoch;
    // What became of the events of this run.
    BatchCounts counts_ CORVANE_GUARDED_BY(*accessQueue_);
};

}  // namespace corvane
