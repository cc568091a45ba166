#include <corvane/Upload/SignedEntity.h>

#include <corvane/Store/Store.h>
#include <corvane/Upload/LedgerEntity.h>
#include <corvane/Upload/LedgerEntry.h>
#include <corvane/Upload/UploadDropbox.h>

namespace corvane {

namespace {

Date readDate(StoreStepper& stepper) {
    const auto date = dateFromSeconds(stepper.double_());
    if (!date) throw StoreStepperError(StoreStepperError::badDataInColumn, "no date can hold the number of seconds");
    return *date;
}

}  // namespace

std::vector<StoreColumn> SignedEntity::columns() {
    return {{"identifier", "TEXT", false, true},   {"createdDate", "DOUBLE", false, false},
            {"contentType", "TEXT", false, false}, {"userAgent", "TEXT", false, false},
            {"retries", "INTEGER", false, false},  {"retryAfterDate", "DOUBLE", false, false},
            {"signature", "TEXT", true, false}};
}

StoreTableExtras SignedEntity::extras() {
    const auto willForget = [](const std::shared_ptr<StoreConnection>& connection) {
        // The payloads first: a kill in between leaves rows, and whoever comes next goes on.
        if (!connection->location().isMemory()) {
            const auto payloads = UploadDropbox::directoryBeside(*connection);
            for (const auto& document : Store<SignedEntity>(connection).keys()) {
                UploadDropbox::remove(payloads, document);
            }
        }
        Store<DocumentEntity> documents(connection);
        const auto sums = documents.sums();
        // Of what a release without a ledger has written there is nothing but the row.
        const ForgottenRecords forgotten{.events = sums.at(1),
                                         .documents = Store<SignedEntity>(connection).sums().at(0)};
        connection->run(Store<DocumentEntity>::table().deleteAllSQL());
        noteForgotten(connection, forgotten);
        return forgotten;
    };
    return {.companions = {Store<DocumentEntity>::table().createSQL(), Store<LedgerEntity>::table().createSQL()},
            .willForget = willForget};
}

SignedEntity SignedEntity::read(StoreStepper& stepper) {
    SignedEntity entity;
    entity.identifier = stepper.text();
    entity.createdDate = readDate(stepper);
    entity.contentType = stepper.text();
    entity.userAgent = stepper.text();
    entity.retries = stepper.count();
    entity.retryAfterDate = readDate(stepper);
    entity.signature = stepper.optionalText();
    return entity;
}

StorableValue SignedEntity::storableValue(std::string_view columnName) const {
    if (columnName == "identifier") return identifier;
    if (columnName == "createdDate") return secondsSince1970(createdDate);
    if (columnName == "contentType") return contentType;
    if (columnName == "userAgent") return userAgent;
    if (columnName == "retries") return retries;
    if (columnName == "retryAfterDate") return secondsSince1970(retryAfterDate);
    return signature;
}

}  // namespace corvane
