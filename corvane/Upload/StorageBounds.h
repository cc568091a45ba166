#pragma once

#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Upload/DeliveryLedger.h>
#include <corvane/Upload/LedgerBook.h>
#include <corvane/Upload/UploadDropboxType.h>
#include <corvane/Upload/UploadRows.h>
#include <corvane/Upload/UploadServiceType.h>

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace corvane {

/// How much an endpoint may keep. A value.
struct StorageLimits {
    std::int64_t maximumBytes = std::int64_t{1} << 30;         ///< of payloads and the text of batches
    std::optional<std::chrono::milliseconds> maximumAge = {};  ///< of a document, since it was handed over
};

/// Gives up the oldest documents when more is stored than the configuration allows, or they are older. One that is
/// under way is withdrawn first, and given up when its transfer has ended without getting through. Batches that are
/// open are never touched.
///
/// Owned by an `UploadManager`, on whose queue it works. Internal.
class StorageBounds : public std::enable_shared_from_this<StorageBounds> {
  public:
    /// The parts of the manager.
    StorageBounds(StorageLimits limits, std::shared_ptr<SerialQueue> queue, std::shared_ptr<UploadServiceType> service,
                  std::shared_ptr<UploadRows> rows, std::shared_ptr<UploadDropboxType> dropbox,
                  std::shared_ptr<DeliveryLedger> ledger, std::shared_ptr<LedgerBook> book);

    /// Compares what was counted with the payloads that there are, a portion at a time, and keeps the bounds then.
    /// On the manager's queue, as the next (the process is stopped with a message).
    void begin();
    /// Looks whether a bound is met. Logs what fails.
    /// @param added bytes of a payload that has come
    void keep(std::int64_t added = 0);
    /// All documents have gone. Any thread.
    void forget() { book_->setUncountedBytes(0); }
    /// A document is not under way any more, and has not got through. Returns why it is to be given up, if it is.
    [[nodiscard]] std::optional<DeliveryUpdate::Reason> takeReason(const std::string& identifier);
    /// Deletes row and payload of a document that is given up for such a reason. Any thread.
    void giveUp(const std::string& identifier, DeliveryUpdate::Reason reason);
    /// Whether a document is about to be given up, so that it is not to be sent. Any thread.
    [[nodiscard]] bool isWithdrawn(const std::string& identifier);
    /// A document has got through, or is gone for another reason. Any thread.
    void end(const std::string& identifier);

  private:
    struct Check;
    struct Withdrawn {
        DeliveryUpdate::Reason reason;
        std::int64_t size = 0;       // of its payload
        std::int64_t uncounted = 0;  // bytes of its payload that its row does not know of
    };
    using Documents = std::map<std::string, Withdrawn>;
    struct Excess {
        Documents documents;
        bool isComplete = true;  // there are no more of them
    };

    void checkPortion(std::shared_ptr<Check> check) CORVANE_REQUIRES(*queue_);
    /// The oldest documents that are too old or too much, but for those that are being withdrawn; some of them, if they
    /// are many.
    [[nodiscard]] Excess excess() CORVANE_REQUIRES(*queue_);
    /// The oldest stored document, if it matters with so many bytes stored.
    [[nodiscard]] const UploadRows::Oldest* oldestIfNeeded(std::int64_t bytes) CORVANE_REQUIRES(*queue_);
    [[nodiscard]] bool isStored(const std::string& identifier);
    [[nodiscard]] bool isTooOld(const UploadRows::Oldest& document) const;
    [[nodiscard]] std::size_t countBeingWithdrawn();
    [[nodiscard]] std::int64_t bytesBeingWithdrawn();
    void withdraw(Documents documents) CORVANE_REQUIRES(*queue_);
    void keepLater();
    /// Bytes of a document's payload as it is now, or as it was written.
    [[nodiscard]] std::int64_t sizeOf(const UploadRows::Oldest& document);
    /// Says so once until there is room again.
    void logBound(std::int64_t bytes);
    void noteRoom();

    const StorageLimits limits_;
    const std::shared_ptr<SerialQueue> queue_;
    const std::shared_ptr<UploadServiceType> service_;
    const std::shared_ptr<UploadRows> rows_;
    const std::shared_ptr<UploadDropboxType> dropbox_;
    const std::shared_ptr<DeliveryLedger> ledger_;
    const std::shared_ptr<LedgerBook> book_;

    std::atomic<bool> isMet_ = false;
    std::deque<UploadRows::Oldest> oldest_ CORVANE_GUARDED_BY(*queue_);  // the next ones; some may be gone by now
    // What other processes write and remove is in no sum of ours: when the bound is met, and once in a while, the rows
    // are looked at.
    std::int64_t addedSince_ CORVANE_GUARDED_BY(*queue_) = 0;

    Mutex mutex_;
    Documents withdrawn_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane
