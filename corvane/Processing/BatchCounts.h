#pragma once

#include <corvane/Models/RejectedEvent.h>
#include <corvane/Processing/UploadBatch.h>
#include <corvane/Processing/UploadBatchEntity.h>
#include <corvane/Upload/DeliveryLedger.h>
#include <corvane/Upload/LedgerBook.h>

#include <cstdint>
#include <memory>
#include <vector>

namespace corvane {

/// What became of the events that a batching processor has taken in this run, and how much its batches hold: its part
/// in the ledger. Owned by `UploadBatches`, and used on the access queue. Internal.
class BatchCounts {
  public:
    explicit BatchCounts(std::shared_ptr<LedgerBook> book);

    void accept() { ++counts_.accepted; }
    void reject(RejectedEvent::Reason reason);
    /// A batch is a document's.
    void handOver(const UploadBatch& batch);
    /// A batch is left to its rows, as one of an earlier run.
    void leave(const UploadBatch& batch);
    /// There was neither a row of a batch nor one of its document, whose going would count its events.
    void settle(const UploadBatch& batch, const DeliveryLedger::Settled& settled);
    /// A batch is dropped. Returns how many of its events were in no row, where they are counted otherwise.
    /// @param hasRows whether its rows, if it has any, are in the database of the ledger
    std::int64_t forget(const UploadBatch& batch, bool hasRows);

    /// The rows of earlier runs and other processes, and one that has become a document.
    void setOthers(const std::vector<UploadBatchEntity::Size>& rows);
    void handOver(const UploadBatchEntity& other);

    /// Tells the book at its end what the batches hold that were added.
    class Publication {
      public:
        explicit Publication(BatchCounts& counts) : counts_(counts) {
            counts_.counts_.open = {};
            counts_.counts_.openBytes = 0;
        }
        Publication(const Publication&) = delete;
        Publication& operator=(const Publication&) = delete;
        ~Publication() { counts_.book_->setBatches(counts_.counts_); }
        void add(const UploadBatch& batch);

      private:
        BatchCounts& counts_;
    };

  private:
    const std::shared_ptr<LedgerBook> book_;
    LedgerBook::Batches counts_;
};

}  // namespace corvane
