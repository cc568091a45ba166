#include <corvane/Processing/DocumentHandOver.h>

#include <corvane/Platform/UUID.h>
#include <corvane/Processing/UserEvents.h>
#include <corvane/Upload/UploadRequest.h>

#include <cstdint>
#include <utility>

namespace corvane {

DocumentHandOver::DocumentHandOver(Client client, std::shared_ptr<UploadManagerType> uploadManager,
                                   std::shared_ptr<DeferredStore<UploadBatchEntity>> deferredStore,
                                   std::shared_ptr<DeliveryLedger> ledger)
    : client_(std::move(client)),
      uploadManager_(std::move(uploadManager)),
      deferredStore_(std::move(deferredStore)),
      ledger_(std::move(ledger)) {}

DocumentHandOver::Removal DocumentHandOver::handOver(const Contents& contents, const MayDelete& mayDelete) {
    const auto document = std::make_shared<UserEvents>(contents.session, contents.events, newUUID());
    Removal removal;
    removal.isDone = contents.rows.empty();
    std::size_t count = 0;
    for (const auto& events : contents.events) count += events->count();
    ledger_->add(document->identifier(), static_cast<std::int64_t>(count));
    try {
        UploadRequest request{client_, document};
        request.events = static_cast<std::int64_t>(count);
        request.epoch = contents.epoch;
        request.durability = contents.durability;
        request.removeBackup = [&](const std::shared_ptr<StoreConnection>& connection) {
            removeBackup(connection, contents, mayDelete, removal);
        };
        removal.taken = uploadManager_->upload(request);
    } catch (...) {
        ledger_->remove(document->identifier());
        throw;
    }
    if (removal.taken == UploadTaken::forgotten) ledger_->remove(document->identifier());
    removal.document = document->identifier();
    if (removal.taken != UploadTaken::recorded) {  // what the transaction did is undone
        return {.document = std::move(removal.document), .taken = removal.taken, .error = std::nullopt};
    }
    if (removal.isKept || removal.isDone || removal.error) return removal;
    try {
        deferredStore_->perform([&](Rows& rows) { rows.transaction([&] { deleteRows(rows, contents, mayDelete); }); });
    } catch (...) {
        removal.error = AnyError::current();
    }
    return removal;
}

// Only where both tables are in one file; otherwise the row is deleted afterwards, and a kill in between sends it
// again.
void DocumentHandOver::removeBackup(const std::shared_ptr<StoreConnection>& connection, const Contents& contents,
                                    const MayDelete& mayDelete, Removal& removal) {
    removal.isKept = connection->location().isMemory() && !deferredStore_->isInMemory();
    if (removal.isDone || !deferredStore_->sharesFileWith(*connection)) return;
    try {
        Rows rows(connection);
        deleteRows(rows, contents, mayDelete);
        removal.isDone = true;
    } catch (...) {
        removal.error = AnyError::current();
    }
}

void DocumentHandOver::deleteRows(Rows& rows, const Contents& contents, const MayDelete& mayDelete) {
    if (mayDelete && !mayDelete(rows)) return;
    for (const auto& identifier : contents.rows) rows.deleteWhere("identifier", identifier);
}

}  // namespace corvane
