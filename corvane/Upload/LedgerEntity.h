#pragma once

#include <corvane/Store/StorableValue.h>
#include <corvane/Store/StoreColumn.h>
#include <corvane/Store/StoreConnection.h>
#include <corvane/Store/StoreStepper.h>
#include <corvane/Store/StoreTable.h>

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

/// One of the ledger's totals: a row of the table "ledger". A value. A name that is not known here is a later
/// release's. Whatever the columns of a damaged row hold, it is read, so that it costs no other row.
struct LedgerEntity {
    static constexpr std::string_view tableName = "ledger";
    static constexpr std::int64_t schemaVersion = 0;  ///< never looked at: there may be further names
    static std::vector<StoreColumn> columns();
    static StoreTableExtras extras() { return {.isIndexOnly = true}; }
    static LedgerEntity read(StoreStepper& stepper);
    [[nodiscard]] StorableValue storableValue(std::string_view columnName) const;

    std::string entry;  ///< see `LedgerEntry`; the key
    std::int64_t events = 0;
    std::int64_t documents = 0;
};

/// What a stored document holds: a row of the table "documents", which is there exactly as long as the document's row
/// in "signed_requests". A value.
struct DocumentEntity {
    static constexpr std::string_view tableName = "documents";
    static constexpr std::int64_t schemaVersion = 0;  ///< never looked at
    static std::vector<StoreColumn> columns();
    static StoreTableExtras extras() { return {.isIndexOnly = true}; }
    static DocumentEntity read(StoreStepper& stepper);
    [[nodiscard]] StorableValue storableValue(std::string_view columnName) const;

    std::string identifier;   ///< the document's; the key
    std::int64_t events = 0;  ///< 0 where a release without a ledger has written it
    std::int64_t bytes = 0;   ///< the size of its payload file
};

/// Adds to the total of what was forgotten, inside the caller's transaction. Throws `StoreError`.
void noteForgotten(const std::shared_ptr<StoreConnection>& connection, const ForgottenRecords& forgotten);

}  // namespace corvane
