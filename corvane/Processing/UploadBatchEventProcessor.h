#pragma once

#include <corvane/Export.h>
#include <corvane/Models/Client.h>
#include <corvane/Models/Session.h>
#include <corvane/Platform/ForkMark.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Processing/EventProcessorType.h>
#include <corvane/Processing/UploadBatchEntity.h>
#include <corvane/Processing/UploadBatchEventConfig.h>
#include <corvane/Processing/UploadBatchQueueKey.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Upload/DeliveryLedger.h>
#include <corvane/Upload/DeliveryReport.h>
#include <corvane/Upload/Endpoint.h>
#include <corvane/Upload/EndpointUse.h>
#include <corvane/Upload/UploadManagerType.h>

#include <chrono>
#include <cstddef>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

namespace corvane {

/// Turns events into uploads: collects them per session, or per group within a session, keeps a backup of every open
/// batch on disk, and hands each finished batch to the upload manager as one user-events document.
///
/// A session's batch is finished when it holds `batchSize` events, a group's when the group is left, and all of them
/// when the session ends. Backups that an earlier run left behind are sent when a session starts, a few at a time, so
/// that the new session's events need not wait for all of them; one that cannot be read is logged, and stays. While the
/// database is on disk and reports no error, an event whose submission succeeded is on disk before its completion is
/// called; hand-over is at least once. Failures are logged, and never reach the code that submitted the event.
///
/// The host makes it and adds it to one processor manager, which shares it. Its state lives on the access queue. When
/// it is released, uploads in this process are cancelled; what is not delivered stays on disk for the next run.
///
///     auto uploads = std::make_shared<UploadBatchEventProcessor>(client, endpoint);
///     sessions.processorManager()->add(uploads);
class CORVANE_EXPORT UploadBatchEventProcessor final : public EventProcessorType,
                                                       public std::enable_shared_from_this<UploadBatchEventProcessor> {
  public:
    /// Uploads to `endpoint`, under whose name the database and the payload files are kept in the documents directory.
    /// Touches neither disk nor network. Throws `InvalidArgument`: see `Endpoint`.
    UploadBatchEventProcessor(Client client, const EndpointType& endpoint,
                              const UploadBatchEventConfig& config = UploadBatchEventConfig::default_());
    /// Works with an upload manager and a store of the caller's, for hosts and tests that bring their own. `ledger` is
    /// the one that the manager keeps.
    UploadBatchEventProcessor(Client client, std::shared_ptr<UploadManagerType> uploadManager,
                              std::shared_ptr<DeferredStore<UploadBatchEntity>> deferredStore,
                              const UploadBatchEventConfig& config, std::shared_ptr<DeliveryLedger> ledger);
    ~UploadBatchEventProcessor() override;

    /// Waits until everything that was submitted before this call and is in a finished batch has an outcome, and at
    /// most until `deadline`. Returns what became of all documents so far: delivered, given up, or pending, which is
    /// kept on disk and goes out again with the next run. Documents of earlier runs are waited for too.
    ///
    /// In a child made by `fork` it returns an empty report at once.
    ///
    /// Requires: any thread but the library's queues (the process is stopped with a message).
    DeliveryReport waitForDelivery(std::chrono::steady_clock::time_point deadline) const;

    /// Throws `InvalidArgument` when the processor was added to another session manager before: its batches are that
    /// one's.
    void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) override;
    // The callbacks require the access queue (the process is stopped with a message).
    void process(const ProcessEvent& processEvent) override;
    void didLeaveGroup(const Group& group) override;
    void didStartSession(const Session& session) override;
    void didUpdateSession(const Session& session, bool submitQueues) override;
    void didEndSession(const Session& session, Date endDate) override;
    bool resumeBackgroundProcessing(const std::string& identifier, const std::function<void()>& completion) override;

  private:
    /// An open batch. The identifier names its backup row.
    struct UploadBatchQueue {
        std::string identifier;
        JSON session;  // the session's JSON form as of the last event
        std::shared_ptr<EncodedEvents> events;
        bool isBackedUp = false;  // the row holds all events
    };
    using Queues = std::map<UploadBatchQueueKey, UploadBatchQueue>;
    using Rows = Store<UploadBatchEntity>;
    /// Whether a batch's row may go: asked inside the transaction that deletes it.
    using MayDelete = std::function<bool(Rows&)>;

    UploadBatchEventProcessor(Client client, const Endpoint& endpoint, const UploadBatchEventConfig& config,
                              const std::shared_ptr<DeliveryLedger>& ledger);

    // On the access queue.
    void assertOnQueue(const char* operation) const CORVANE_ASSERT_CAPABILITY(*accessQueue_);
    void setSession(const Session& session) CORVANE_REQUIRES(*accessQueue_);
    [[nodiscard]] UploadBatchQueueKey keyOf(const ProcessEvent& processEvent) const CORVANE_REQUIRES(*accessQueue_);
    void add(const UploadBatchQueueKey& key, const JSON& payload) CORVANE_REQUIRES(*accessQueue_);
    /// Writes the batch's row. Returns whether it is written; if not, that has been logged.
    bool backUp(UploadBatchQueue& queue);
    void backUpAll() CORVANE_REQUIRES(*accessQueue_);
    /// Lets go of unsaved batches whose documents need no second attempt.
    void dropDelivered() CORVANE_REQUIRES(*accessQueue_);
    void submit(const UploadBatchQueueKey& key, bool force) CORVANE_REQUIRES(*accessQueue_);
    /// Hands a batch over that is in no list any more, with the session's data as it is now.
    /// Throws what the manager throws; the batch is then as it was.
    void handOver(UploadBatchQueue& queue) CORVANE_REQUIRES(*accessQueue_);
    /// Sees to it that a batch whose document is under way without a row of its own stays in its backup.
    void keep(UploadBatchQueue& queue, const std::string& document) CORVANE_REQUIRES(*accessQueue_);
    /// Puts a batch back that was refused, before what was added to its successor meanwhile.
    void putBack(Queues::node_type refused) CORVANE_REQUIRES(*accessQueue_);

    /// What became of a batch's row when its document was taken over.
    struct Removal {
        std::string document;
        UploadTaken taken = UploadTaken::underWay;
        bool isKept = false;            // the document's own row would not outlive the process, as this one does
        bool isDone = false;            // it went with the transaction that wrote the document's row
        std::optional<AnyError> error;  // why it could not be deleted
    };
    /// Makes a document and hands it to the upload manager, and deletes the batch's row if it may go and the document
    /// is recorded. Throws what the manager throws.
    Removal upload(const std::string& identifier, const JSON& session,
                   const std::shared_ptr<const EncodedEvents>& events, const MayDelete& mayDelete);
    void removeBackup(const std::shared_ptr<StoreConnection>& connection, const std::string& identifier,
                      const MayDelete& mayDelete, Removal& removal);
    static void deleteRow(Rows& rows, const std::string& identifier, const MayDelete& mayDelete);

    /// Notes which batches were open when their process ended; before this session has any of its own.
    void listTerminated() CORVANE_REQUIRES(*accessQueue_);
    /// Sends some of them, and goes on later, behind what waits on the queue.
    void resubmitTerminated() CORVANE_REQUIRES(*accessQueue_);
    /// Sends one. Returns how many bytes it has.
    std::size_t resubmit(const std::string& identifier) CORVANE_REQUIRES(*accessQueue_);
    void resubmit(UploadBatchEntity batch) CORVANE_REQUIRES(*accessQueue_);

    const Client client_;
    const std::shared_ptr<DeliveryLedger> ledger_;
    const std::shared_ptr<UploadManagerType> uploadManager_;
    const std::shared_ptr<DeferredStore<UploadBatchEntity>> deferredStore_;
    const UploadBatchEventConfig config_;
    std::shared_ptr<const EndpointUse> endpointUse_;  // nothing with a manager of the caller's

    const ForkMark born_;

    // Set once, before the first callback: the queue's own tasks read it without the mutex.
    mutable std::mutex registrationMutex_;
    std::shared_ptr<SerialQueue> accessQueue_;

    Queues batchQueues_ CORVANE_GUARDED_BY(*accessQueue_);
    // Handed over while neither the document's row nor their own could be written, by document; they get theirs once
    // one can be, unless the document has got through before.
    std::map<std::string, UploadBatchQueue> unsaved_ CORVANE_GUARDED_BY(*accessQueue_);
    // Rows that are still to be sent, and are in the ledger.
    std::deque<std::string> terminated_ CORVANE_GUARDED_BY(*accessQueue_);
    std::optional<Session> currentSession_ CORVANE_GUARDED_BY(*accessQueue_);
    // A row could not be written; once one can, all are.
    bool backupsAreBehind_ CORVANE_GUARDED_BY(*accessQueue_) = false;
};

}  // namespace corvane
