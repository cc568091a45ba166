#pragma once

#include <corvane/Processing/UploadBatchEntity.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Upload/DeliveryLedger.h>

#include <cstddef>
#include <deque>
#include <memory>
#include <optional>
#include <string>

namespace corvane {

/// The batches whose process ended before it handed them over: which rows are still to be sent, each in the ledger
/// until a document takes its place. Owned by `UploadBatches`, and used on the access queue. Internal.
class TerminatedBatches {
  public:
    TerminatedBatches(std::shared_ptr<DeferredStore<UploadBatchEntity>> deferredStore,
                      std::shared_ptr<DeliveryLedger> ledger);

    /// Notes every row that is there: at a session's start, before the session has any of its own. One that is noted
    /// already stays where it is.
    void list();

    [[nodiscard]] bool isEmpty() const { return identifiers_.empty(); }
    [[nodiscard]] std::size_t count() const { return identifiers_.size(); }
    /// Sends nothing more of what was noted.
    void clear();

    /// Takes the next row to `send` it, and out of the list and the ledger. One at a time: rows are as large as the
    /// groups that they hold. Returns how many bytes it has; 0 for one that cannot be read, which is logged and stays,
    /// or that another process has sent meanwhile. Requires: not empty.
    template <class Send>
    std::size_t sendNext(const Send& send) {
        const std::string identifier = std::move(identifiers_.front());
        identifiers_.pop_front();
        std::size_t size = 0;
        if (auto batch = read(identifier)) {
            size = batch->events->text().size();
            send(*std::move(batch));
        }
        ledger_->remove(identifier);  // its document is there in its place
        return size;
    }

  private:
    [[nodiscard]] std::optional<UploadBatchEntity> read(const std::string& identifier) const;

    const std::shared_ptr<DeferredStore<UploadBatchEntity>> deferredStore_;
    const std::shared_ptr<DeliveryLedger> ledger_;
    std::deque<std::string> identifiers_;
};

}  // namespace corvane
