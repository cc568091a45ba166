#pragma once

#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Upload/DeliveryLedger.h>
#include <corvane/Upload/SignedEntity.h>
#include <corvane/Upload/StorageBounds.h>
#include <corvane/Upload/StoredUploads.h>
#include <corvane/Upload/UploadDropboxType.h>
#include <corvane/Upload/UploadManagerType.h>
#include <corvane/Upload/UploadResult.h>
#include <corvane/Upload/UploadRetries.h>
#include <corvane/Upload/UploadRows.h>
#include <corvane/Upload/UploadServiceDelegate.h>
#include <corvane/Upload/UploadServiceType.h>

#include <atomic>
#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

/// Keeps the books of uploads: a row in the database and a payload file for each, from the moment a document is taken
/// over until the collector has it, refuses it, or has been tried too often.
///
/// One per batching processor, which owns it; the service holds it weakly as its delegate, and what ends after it has
/// gone is found by the next manager. Rows and files outlive the process. An upload that ends with a retry stays, and
/// goes out again when a manager for its endpoint is next opened, a portion at a time; one that was retried more than
/// four times, or whose file has gone or lost of its contents, is dropped then. With a retry delay it goes out again in
/// the same run, too, of which its row counts one retry at most.
///
/// `open` and `upload` run on the manager's own queue, in the caller's time, and use the deferred store from there;
/// results are handled where they arrive. States: built, opened (what was left over has been sent again, once), closed;
/// uploads work in each of them.
class UploadManager final : public UploadManagerType,
                            public UploadServiceDelegate,
                            public std::enable_shared_from_this<UploadManager> {
  public:
    /// Makes a manager and sets it as the service's delegate. Of the arguments, `ledger` and `book` may be
    /// empty; it then has such a one of its own.
    /// @param retryDelay after which what ended with a retry is sent again in this run, see `UploadRetries`; not at all
    ///        without one
    [[nodiscard]] static std::shared_ptr<UploadManager> create(
        std::shared_ptr<UploadServiceType> service, std::shared_ptr<DeferredStore<SignedEntity>> deferredStore,
        std::shared_ptr<UploadDropboxType> dropbox, std::shared_ptr<DeliveryLedger> ledger = nullptr,
        std::shared_ptr<LedgerBook> book = nullptr, std::optional<std::chrono::milliseconds> retryDelay = std::nullopt,
        const StorageLimits& limits = {});
    ~UploadManager() override;

    /// Opens the store, creates the table, and the first time sends again what is stored. Requires: not on the
    /// manager's queue or the store's.
    void open() override;
    void close() override;
    void registerAccessQueue(std::shared_ptr<SerialQueue> queue) override;
    /// Throws what the encoding, the compression or the payload file failed with; there is then no row. That the row
    /// cannot be written is no reason not to send. Requires: not on the manager's queue or the store's.
    UploadTaken upload(const UploadRequest& request) override;
    void forget() override;
    void readLedger() override { rows_->readLedger(); }
    bool shouldResume(std::string_view identifier, std::function<void()> completion) override;

    /// Deletes row and file of an upload that is over, or counts a retry.
    void uploadService(UploadServiceType& service, const UploadResult& result) override;
    /// The same, with the rows deleted in one transaction.
    void uploadServiceTogether(UploadServiceType& service, const std::vector<UploadResult>& results) override;
    /// Strikes the upload out of the ledger; its row and its file are the other process's.
    void uploadEndedElsewhere(const UploadResult& result) override;
    void uploadDidSend(const std::string& identifier, std::int64_t sent, std::int64_t expected) override;
    void uploadsAreHeldUp(bool lasts) override;
    [[nodiscard]] std::shared_ptr<const std::atomic<bool>> progressIsWanted() const noexcept override;

  private:
    UploadManager(std::shared_ptr<UploadServiceType> service,
                  std::shared_ptr<DeferredStore<SignedEntity>> deferredStore,
                  std::shared_ptr<UploadDropboxType> dropbox, std::shared_ptr<DeliveryLedger> ledger,
                  std::shared_ptr<LedgerBook> book, std::optional<std::chrono::milliseconds> retryDelay,
                  const StorageLimits& limits);

    UploadTaken uploadOnQueue(const UploadRequest& request) CORVANE_REQUIRES(*queue_);
    /// Writes the document's row, and has its backup removed, both or neither.
    [[nodiscard]] UploadTaken record(const SignedEntity& entity, std::int64_t bytes, const UploadRequest& request);
    void removeForgotten(const std::string& identifier);
    /// Removes the payload of an upload that is over, unless its row could not be deleted.
    void didFinish(const UploadResult& result, const std::optional<AnyError>& rowProblem);
    void didFailForNow(const UploadResult::Retry& retry);
    [[nodiscard]] std::vector<std::string> storedDocuments();
    /// Notes the end of an upload. Returns whether it was under way without a row.
    bool forgetUnrecorded(const std::string& identifier);
    [[nodiscard]] bool hasRow(const std::string& identifier);

    const std::shared_ptr<UploadServiceType> service_;
    const std::shared_ptr<UploadRows> rows_;
    const std::shared_ptr<UploadDropboxType> dropbox_;
    const std::shared_ptr<DeliveryLedger> ledger_;

    const std::shared_ptr<SerialQueue> queue_ =
        std::make_shared<SerialQueue>("com.veskar.corvane.upload-manager", SerialQueue::QualityOfService::background);
    const std::shared_ptr<StorageBounds> bounds_;
    const std::shared_ptr<StoredUploads> stored_;
    const std::shared_ptr<UploadRetries> retries_;  // nothing without a delay for them
    bool hasSentStored_ CORVANE_GUARDED_BY(*queue_) = false;

    Mutex mutex_;
    std::set<std::string> unrecorded_ CORVANE_GUARDED_BY(mutex_);  // documents that are under way without a row
};

}  // namespace corvane
