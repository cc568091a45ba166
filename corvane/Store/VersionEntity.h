#pragma once

#include <corvane/Store/StorableValue.h>
#include <corvane/Store/StoreColumn.h>
#include <corvane/Store/StoreStepper.h>

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

/// The schema version in which an entity table was last written: a row of the table "versions". A value.
struct VersionEntity {
    static constexpr std::string_view tableName = "versions";
    static constexpr std::int64_t schemaVersion = 0;  ///< never looked at: the table of versions has no version
    static std::vector<StoreColumn> columns();
    static VersionEntity read(StoreStepper& stepper);
    [[nodiscard]] StorableValue storableValue(std::string_view columnName) const;

    std::string entityName;  ///< the entity's table name; the key
    std::int64_t entityVersion = 0;
};

}  // namespace corvane
