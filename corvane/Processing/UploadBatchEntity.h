#pragma once

#include <corvane/Models/JSON.h>
#include <corvane/Processing/EncodedEvents.h>
#include <corvane/Store/Storable.h>
#include <corvane/Store/StoreConnection.h>
#include <corvane/Store/StoreTable.h>

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

/// The backup of a batch that has not been handed over yet: one row of "upload_batches". The format outlives the
/// process: names and layout may not change without a new schema version.
struct UploadBatchEntity {
    static constexpr std::string_view tableName = "upload_batches";
    static constexpr std::int64_t schemaVersion = 0;

    std::string identifier;                       ///< the queue's
    JSON session;                                 ///< the session's JSON form as of the last event
    std::shared_ptr<const EncodedEvents> events;  ///< never null

    [[nodiscard]] static std::vector<StoreColumn> columns();
    /// The ledger is told what is forgotten.
    [[nodiscard]] static StoreTableExtras extras();

    /// How much a row holds: no events where it cannot be read.
    struct Size {
        std::string identifier;
        std::int64_t events = 0;
        std::int64_t bytes = 0;
    };
    /// The sizes of all rows. On the store's queue; throws `StoreError`.
    [[nodiscard]] static std::vector<Size> sizes(StoreConnection& connection);
    [[nodiscard]] StorableValue storableValue(std::string_view columnName) const;
    /// Throws `StoreStepper::Errors`: badColumn, or badDataInColumn for a blob that is not JSON of this shape.
    [[nodiscard]] static UploadBatchEntity read(StoreStepper& stepper);
};

}  // namespace corvane
