#include <corvane/Store/VersionEntity.h>

namespace corvane {

std::vector<StoreColumn> VersionEntity::columns() {
    return {{"entityName", "TEXT", false, true}, {"entityVersion", "INTEGER", false, false}};
}

VersionEntity VersionEntity::read(StoreStepper& stepper) {
    VersionEntity entity;
    entity.entityName = stepper.text();
    entity.entityVersion = stepper.integer();
    return entity;
}

StorableValue VersionEntity::storableValue(std::string_view columnName) const {
    if (columnName == "entityName") return entityName;
    if (columnName == "entityVersion") return entityVersion;
    return StorableValue::absent();
}

}  // namespace corvane
