#pragma once

#include <corvane/Models/Client.h>
#include <corvane/Platform/Error.h>
#include <corvane/Processing/UploadBatchEntity.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Upload/DeliveryLedger.h>
#include <corvane/Upload/UploadManagerType.h>

#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace corvane {

/// Makes documents of batches and hands them to the upload manager; the batch's row goes with the document's coming.
/// Owned by `UploadBatches`, and used on the access queue. Internal.
class DocumentHandOver {
  public:
    using Rows = Store<UploadBatchEntity>;
    /// Whether a batch's row may go: asked inside the transaction that deletes it.
    using MayDelete = std::function<bool(Rows&)>;

    /// What became of a batch's row when its document was taken over.
    struct Removal {
        std::string document;
        UploadTaken taken = UploadTaken::underWay;
        bool isKept = false;            // the document's own row would not outlive the process, as this one does
        bool isDone = false;            // it went with the transaction that wrote the document's row
        std::optional<AnyError> error;  // why it could not be deleted
    };

    DocumentHandOver(Client client, std::shared_ptr<UploadManagerType> uploadManager,
                     std::shared_ptr<DeferredStore<UploadBatchEntity>> deferredStore,
                     std::shared_ptr<DeliveryLedger> ledger);

    /// Makes a document, enters it in the ledger and hands it over, and deletes the batch's row if it may go and the
    /// document is recorded. Throws what the manager throws; the batch is then as it was.
    Removal handOver(const UploadBatchEntity& batch, const MayDelete& mayDelete);

  private:
    void removeBackup(const std::shared_ptr<StoreConnection>& connection, const std::string& identifier,
                      const MayDelete& mayDelete, Removal& removal);
    static void deleteRow(Rows& rows, const std::string& identifier, const MayDelete& mayDelete);

    const Client client_;
    const std::shared_ptr<UploadManagerType> uploadManager_;
    const std::shared_ptr<DeferredStore<UploadBatchEntity>> deferredStore_;
    const std::shared_ptr<DeliveryLedger> ledger_;
};

}  // namespace corvane
