#include <corvane/Store/EpochEntity.h>

#include <corvane/Store/Store.h>

namespace corvane {

std::vector<StoreColumn> EpochEntity::columns() {
    return {{"entityName", "TEXT", false, true},
            {"epoch", "INTEGER", false, false},
            {"events", "INTEGER", false, false},
            {"documents", "INTEGER", false, false}};
}

EpochEntity EpochEntity::read(StoreStepper& stepper) {
    EpochEntity entity;
    entity.entityName = stepper.text();
    entity.epoch = stepper.count();
    entity.forgotten.events = stepper.count();
    entity.forgotten.documents = stepper.count();
    return entity;
}

StorableValue EpochEntity::storableValue(std::string_view columnName) const {
    if (columnName == "entityName") return entityName;
    if (columnName == "epoch") return epoch;
    return columnName == "events" ? forgotten.events : forgotten.documents;
}

void forgetBefore(std::int64_t epoch, const std::shared_ptr<StoreConnection>& connection, const StoreTable& table) {
    connection->createTable(table);
    Store<EpochEntity> epochs(connection);
    epochs.createTable();
    const auto known = epochs.fetchWhere("entityName", table.name());
    if (!known.empty() && known.front().epoch >= epoch) return;
    const auto& note = table.extras().willForget;
    const auto forgotten = note ? note(connection) : ForgottenRecords();
    connection->run("PRAGMA secure_delete=ON;");
    connection->run(table.deleteAllSQL());
    epochs.insert({table.name(), epoch, forgotten});
}

}  // namespace corvane
