#pragma once

#include <corvane/Store/StorableValue.h>
#include <corvane/Store/StoreColumn.h>
#include <corvane/Store/StoreStepper.h>
#include <corvane/Store/StoreTable.h>

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

/// Up to which epoch (see `RecordingSwitch`) a table has forgotten what was recorded, and how much that was the last
/// time: a row of the table "epochs". A table without a row has forgotten nothing. A value.
struct EpochEntity {
    static constexpr std::string_view tableName = "epochs";
    static constexpr std::int64_t schemaVersion = 0;  ///< never looked at
    static std::vector<StoreColumn> columns();
    static EpochEntity read(StoreStepper& stepper);
    [[nodiscard]] StorableValue storableValue(std::string_view columnName) const;

    std::string entityName;  ///< the entity's table name; the key
    std::int64_t epoch = 0;
    ForgottenRecords forgotten;
};

/// Creates the table unless it is there, and drops what it holds of earlier epochs. Inside the caller's transaction.
/// Throws `StoreError`.
void forgetBefore(std::int64_t epoch, const std::shared_ptr<StoreConnection>& connection, const StoreTable& table);

}  // namespace corvane
