#pragma once

#include <corvane/Export.h>
#include <corvane/Models/Client.h>
#include <corvane/Platform/Durability.h>
#include <corvane/Processing/EventProcessorType.h>
#include <corvane/Upload/DeliveryReport.h>
#include <corvane/Upload/DeliveryUpdate.h>
#include <corvane/Upload/Endpoint.h>
#include <corvane/Upload/Ledger.h>

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace corvane {

class UploadBatches;

/// What can be set of the batching processor, by name. A value.
struct UploadBatchEventOptions {
    int batchSize = 50;           ///< how many events of a session make a document that is sent; at least 1
    bool batchDebugging = false;  ///< whether readable copies of documents and responses are kept beside the payloads

    /// How many bytes the endpoint may have on disk, in payloads and in the text of open batches; SQLite's files do not
    /// shrink, and are not counted. When there are more, the oldest documents are given up, each under `givenUp.size`
    /// in the ledger; open batches never are, and a document that is under way is withdrawn first, and may get through
    /// yet. At least 1. What other processes store counts as of the first session's start.
    std::int64_t maximumBytesOnDisk = std::int64_t{1} << 30;
    /// How old a stored document may get, in milliseconds since it was handed over, by the wall clock; at least 1. An
    /// older one is given up, as above, when the first session begins, another document is stored, or some are sent
    /// again. Nothing: any age.
    std::optional<std::chrono::milliseconds> maximumAge = std::nullopt;

    /// A session's open batch is sent when its oldest event has been in it for so long, and the session goes on; a
    /// group's stays until it is left. The time counts while the machine is suspended, too. Without one a batch waits
    /// until it is full, is flushed, or its session ends. At least 1 ms.
    std::optional<std::chrono::milliseconds> maximumDelay = {};
    /// A document that did not get through (there was no connection; the server answered 401, 429 or 5xx) is sent again
    /// after so long while the process runs. The delay doubles, up to an hour, with each pass over such documents in
    /// which nothing gets through, and is the first one again after a success; up to a quarter more is added at random.
    /// A server's Retry-After is obeyed, up to a day at a time. A document that the server was sent a hundred times in
    /// one run waits for the next one. Without a delay each waits for the next run. At least 1 ms.
    std::optional<std::chrono::milliseconds> retryDelay = {};

    /// What survives a power cut of what was acknowledged. With `powerCut` all of it does, as far as the file system
    /// and the disk keep their word: completions, and calls that wait for them, wait for the disk. Without it, all but
    /// the last moments; see `Durability`. It is the endpoint's files that count: whoever shares them in another
    /// process says so, too.
    Durability durability = Durability::processKill;
};

/// How the batching processor batches. A value.
///
///     UploadBatchEventConfig config({.batchSize = 20});
class CORVANE_EXPORT UploadBatchEventConfig {
  public:
    /// The default values: batches of 50, no debugging copies.
    UploadBatchEventConfig() = default;
    /// Throws `InvalidArgument` for what the options do not allow.
    explicit UploadBatchEventConfig(const UploadBatchEventOptions& options);
    /// @param batchSize how many events of a session make a document that is sent; at least 1
    /// @param batchDebugging whether readable copies of documents and responses are kept beside the payload files
    /// Throws `InvalidArgument` for a batch size below 1.
    UploadBatchEventConfig(int batchSize, bool batchDebugging);

    /// The one shared instance of the default values.
    [[nodiscard]] static const UploadBatchEventConfig& default_();

    [[nodiscard]] std::size_t batchSize() const { return static_cast<std::size_t>(options_.batchSize); }
    [[nodiscard]] bool batchDebugging() const { return options_.batchDebugging; }
    [[nodiscard]] const UploadBatchEventOptions& options() const { return options_; }

  private:
    UploadBatchEventOptions options_;
};

/// Turns events into uploads: collects them per session, or per group within a session, keeps a backup of every open
/// batch on disk, and hands each finished batch to the upload manager as one user-events document.
///
/// A session's batch is finished when it holds `batchSize` events, is flushed or has waited for `maximumDelay`, a
/// group's when the group is left, and all of them when the session ends. Backups that an earlier run left behind are
/// sent when a session starts, a few at a time, so that the new session's events need not wait for all of them; one
/// that cannot be read is logged, and stays. While the database is on disk and reports no error, an event whose
/// submission succeeded is on disk before its completion is called; hand-over is at least once. Failures are logged,
/// and never reach the code that submitted the event.
///
/// The host makes it and adds it to one processor manager, which shares it. Its state lives on the access queue. When
/// it is released, uploads in this process are cancelled; what is not delivered stays on disk for the next run.
///
///     auto uploads = std::make_shared<UploadBatchEventProcessor>(client, endpoint);
///     sessions.processorManager()->add(uploads);
class CORVANE_EXPORT UploadBatchEventProcessor final : public EventProcessorType {
  public:
    /// Uploads to `endpoint`, under whose name the database and the payload files are kept in the documents directory.
    /// Touches neither disk nor network. Throws `InvalidArgument`: see `Endpoint`.
    UploadBatchEventProcessor(Client client, const EndpointType& endpoint,
                              const UploadBatchEventConfig& config = UploadBatchEventConfig::default_());
    /// Internal: works with batches that were made with an upload manager and a store of the caller's.
    explicit UploadBatchEventProcessor(std::shared_ptr<UploadBatches> batches);
    UploadBatchEventProcessor(const UploadBatchEventProcessor&) = delete;
    UploadBatchEventProcessor& operator=(const UploadBatchEventProcessor&) = delete;
    ~UploadBatchEventProcessor() override;

    /// Waits until everything that was submitted before this call and is in a finished batch has an outcome, and at
    /// most until `deadline`. Returns what became of all documents so far: delivered, given up, or pending, which is
    /// kept on disk and goes out again with the next run. Documents of earlier runs are waited for too. One that has
    /// failed and is sent again while the process runs is not waited for a second time: it is pending until it arrives.
    ///
    /// In a child made by `fork` it returns an empty report at once.
    ///
    /// Requires: any thread but the library's queues (the process is stopped with a message).
    /// @param options what not to wait for
    DeliveryReport waitForDelivery(std::chrono::steady_clock::time_point deadline,
                                   const DeliveryWaitOptions& options = {}) const;

    /// Hands the session's open batch over now, full or not; the session goes on, and groups that are not left keep
    /// theirs. Returns at once: it takes effect behind what was submitted before, and a `waitForDelivery` that is
    /// called next waits for it. Does nothing while there is no session, or nothing in its batch; a batch that cannot
    /// be handed over stays open, which is logged. Any thread.
    void flush();

    /// What became of everything that was recorded for the endpoint: what this process has done, at once, and of other
    /// processes what was on disk when the first session began, or at the last `readLedger`. For the moment in which a
    /// batch is handed over its events may count both as open and as waiting. Any thread; waits for nothing.
    [[nodiscard]] Ledger ledger() const;
    /// Reads the ledger on disk again, and calls the completion, if any, with it, on the queue of the session manager.
    /// Any thread. Does nothing for a processor that was never added.
    void readLedger(std::function<void(const Ledger& ledger)> completion);

    /// Has `observer` told of every document of the endpoint as it happens, from now on and in order, in place of an
    /// observer that was set before; an empty one ends that. Documents that earlier runs have left are told of, too.
    ///
    /// It is called on the main queue (see `MainQueue`), never inside a call of the host's; what it throws is logged.
    /// One that is removed or replaced on the main queue is not called any more once that call has returned; removed
    /// elsewhere, a call of it that runs at this moment comes to its end. It is removed with the processor. What the
    /// host puts on the main queue when `waitForDelivery` has returned runs behind all that it has waited for.
    ///
    /// While the main queue is busy, the updates wait for it, of a document's progress the latest alone. The transfer
    /// agent reports the progress of documents that were handed over while an observer was set. Any thread, also from
    /// inside the observer.
    void setDeliveryObserver(DeliveryObserver observer);

    /// Throws `InvalidArgument` when the processor was added to another session manager before: its batches are that
    /// one's.
    void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) override;
    // The callbacks require the access queue (the process is stopped with a message).
    void process(const ProcessEvent& processEvent) override;
    void didLeaveGroup(const Group& group) override;
    void didStartSession(const Session& session) override;
    void didUpdateSession(const Session& session, bool submitQueues) override;
    void didEndSession(const Session& session, Date endDate) override;
    void didReject(const RejectedEvent& event) override;
    ForgottenRecords forget() override;
    bool resumeBackgroundProcessing(const std::string& identifier, const std::function<void()>& completion) override;

  private:
    const std::shared_ptr<UploadBatches> batches_;
};

}  // namespace corvane
