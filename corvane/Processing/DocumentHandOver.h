#pragma once

#include <corvane/Models/Client.h>
#include <corvane/Platform/Durability.h>
#include <corvane/Platform/Error.h>
#include <corvane/Processing/UploadBatchEntity.h>
#include <corvane/Processing/UserEvents.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Upload/DeliveryLedger.h>
#include <corvane/Upload/UploadManagerType.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace corvane {

/// Makes documents of batches and hands them to the upload manager; the batch's row goes with the document's coming.
/// Owned by `UploadBatches`, and used on the access queue. Internal.
class DocumentHandOver {
  public:
    using Rows = Store<UploadBatchEntity>;

    /// What goes into one document, and the rows that it replaces.
    struct Contents {
        JSON session;
        UserEvents::Events events;
        std::vector<std::string> rows;
        std::int64_t epoch = 0;  // in which they were recorded
        Durability durability = Durability::powerCut;
    };
    /// Whether a batch's rows may go: asked inside the transaction that deletes it.
    using MayDelete = std::function<bool(Rows&)>;

    /// What became of a batch's rows when its document was taken over.
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

    /// Makes a document, enters it in the ledger and hands it over, and deletes the batch's rows if they may go and the
    /// document is recorded. Throws what the manager throws; the batch is then as it was.
    /// What is of an epoch that is over is not handed over, and stays where it is.
    Removal handOver(const Contents& contents, const MayDelete& mayDelete);

  private:
    void removeBackup(const std::shared_ptr<StoreConnection>& connection, const Contents& contents,
                      const MayDelete& mayDelete, Removal& removal);
    static void deleteRows(Rows& rows, const Contents& contents, const MayDelete& mayDelete);

    const Client client_;
    const std::shared_ptr<UploadManagerType> uploadManager_;
    const std::shared_ptr<DeferredStore<UploadBatchEntity>> deferredStore_;
    const std::shared_ptr<DeliveryLedger> ledger_;
};

}  // namespace corvane
