#pragma once

#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Upload/Backlog.h>
#include <corvane/Upload/DeliveryLedger.h>
#include <corvane/Upload/PreparedUploadRequest.h>
#include <corvane/Upload/SignedEntity.h>
#include <corvane/Upload/StorageBounds.h>
#include <corvane/Upload/UploadDropboxType.h>
#include <corvane/Upload/UploadRows.h>
#include <corvane/Upload/UploadServiceType.h>

#include <cstdint>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace corvane {

/// Sends again what earlier runs have left, a portion at a time: as uploads end, the next ones go out. Owned by an
/// `UploadManager`, on whose queue it works. Internal.
class StoredUploads : public std::enable_shared_from_this<StoredUploads> {
  public:
    /// An upload whose row counts more retries than this is not sent again.
    static constexpr std::int64_t maximumRetries = 4;

    /// The parts of the manager.
    StoredUploads(std::shared_ptr<SerialQueue> queue, std::shared_ptr<UploadServiceType> service,
                  std::shared_ptr<UploadRows> rows, std::shared_ptr<UploadDropboxType> dropbox,
                  std::shared_ptr<DeliveryLedger> ledger, std::shared_ptr<StorageBounds> bounds);

    /// The queue of the submissions, which a next portion must not overtake. Any thread.
    void registerAccessQueue(std::shared_ptr<SerialQueue> queue);
    /// Enters all that is stored, and sends the first portion. Logs what fails. On the manager's queue, as `find` and
    /// `send` (the process is stopped with a message).
    void begin();
    /// Uploads have ended here or elsewhere, of whichever run: the next portion may be due. Any thread.
    void end(const std::vector<std::string>& identifiers);

    /// Gives up what is stored beyond the bounds.
    void keepBounds() { bounds_->keep(); }
    /// What is to be sent of a stored document, however often it was retried, or nothing when it is being given up, its
    /// row has gone or its payload, with which the row goes, too. Throws `StoreError` and `DeferredStoreError`.
    [[nodiscard]] std::optional<PreparedUploadRequest> find(const std::string& identifier);
    /// Sends what is not in flight.
    void send(std::vector<PreparedUploadRequest> requests);
    /// Runs a task of this queue's behind the submissions that wait: results overtake them, so that a backlog that ends
    /// quickly would keep them waiting. Any thread.
    void runLater(Task task);
    /// The queue of the submissions; this one when none was registered. Any thread.
    [[nodiscard]] std::shared_ptr<SerialQueue> accessQueue();

  private:
    void list() CORVANE_REQUIRES(*queue_);
    /// Sends the next portion. Goes on with what ends.
    void sendPortion() CORVANE_REQUIRES(*queue_);
    void sendPortionLater();
    /// The stored row, or nothing when it has gone or cannot be read.
    [[nodiscard]] std::optional<SignedEntity> storedRow(const std::string& identifier);
    /// What is to be sent of a stored row, or nothing when it is dropped.
    [[nodiscard]] std::optional<PreparedUploadRequest> retryRequest(const SignedEntity& entity);
    /// Deletes the row and the file of an upload that was retried too often.
    void dropExceeded(const SignedEntity& entity);
    /// The row's request, or nothing when its payload file has gone or is damaged; the row is then deleted.
    [[nodiscard]] std::optional<PreparedUploadRequest> preparedRequest(const SignedEntity& entity);
    void giveUp(const std::string& identifier, DeliveryUpdate::Reason reason);

    /// Removes the payloads that are old, of which there is no row, and which nobody has under way: a process was
    /// killed between payload and row, and the events went out, or will, from their batch's backup.
    /// @param recorded what there are rows of
    void removeOrphans(const std::set<std::string>& recorded);
    void removeOrphans(const std::vector<std::string>& orphans, const std::set<std::string>& inFlight);

    const std::shared_ptr<SerialQueue> queue_;
    const std::shared_ptr<UploadServiceType> service_;
    const std::shared_ptr<UploadRows> rows_;
    const std::shared_ptr<UploadDropboxType> dropbox_;
    const std::shared_ptr<DeliveryLedger> ledger_;
    const std::shared_ptr<StorageBounds> bounds_;

    Backlog backlog_;

    Mutex mutex_;
    std::shared_ptr<SerialQueue> accessQueue_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane
