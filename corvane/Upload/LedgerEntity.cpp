#include <corvane/Upload/LedgerEntity.h>

#include <corvane/Store/Store.h>
#include <corvane/Upload/LedgerEntry.h>

namespace corvane {

std::vector<StoreColumn> LedgerEntity::columns() {
    return {
        {"entry", "TEXT", false, true}, {"events", "INTEGER", false, false}, {"documents", "INTEGER", false, false}};
}

LedgerEntity LedgerEntity::read(StoreStepper& stepper) {
    LedgerEntity entity;
    entity.entry = stepper.optionalText().value_or("");
    entity.events = stepper.count();
    entity.documents = stepper.count();
    return entity;
}

StorableValue LedgerEntity::storableValue(std::string_view columnName) const {
    if (columnName == "entry") return entry;
    return columnName == "events" ? events : documents;
}

std::vector<StoreColumn> DocumentEntity::columns() {
    return {
        {"identifier", "TEXT", false, true}, {"events", "INTEGER", false, false}, {"bytes", "INTEGER", false, false}};
}

DocumentEntity DocumentEntity::read(StoreStepper& stepper) {
    DocumentEntity entity;
    entity.identifier = stepper.optionalText().value_or("");
    entity.events = stepper.count();
    entity.bytes = stepper.count();
    return entity;
}

StorableValue DocumentEntity::storableValue(std::string_view columnName) const {
    if (columnName == "identifier") return identifier;
    return columnName == "events" ? events : bytes;
}

void noteForgotten(const std::shared_ptr<StoreConnection>& connection, const ForgottenRecords& forgotten) {
    Store<LedgerEntity> ledger(connection);
    ledger.createTable();
    ledger.add({std::string(nameOf(LedgerEntry::givenUpForgotten)), forgotten.events, forgotten.documents});
}

}  // namespace corvane
