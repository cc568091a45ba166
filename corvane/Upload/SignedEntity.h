#pragma once

#include <corvane/Platform/Date.h>
#include <corvane/Store/StorableValue.h>
#include <corvane/Store/StoreColumn.h>
#include <corvane/Store/StoreStepper.h>
#include <corvane/Store/StoreTable.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

/// An upload that is not finished: a row of the table "signed_requests". A value. Dates are kept as seconds since 1970.
struct SignedEntity {
    static constexpr std::string_view tableName = "signed_requests";
    static constexpr std::int64_t schemaVersion = 2;
    static std::vector<StoreColumn> columns();
    /// The tables of the ledger, which is told what is forgotten.
    static StoreTableExtras extras();
    /// Throws `StoreStepperError`; a date that cannot be one is `badDataInColumn`.
    static SignedEntity read(StoreStepper& stepper);
    [[nodiscard]] StorableValue storableValue(std::string_view columnName) const;

    std::string identifier;                                ///< the document's identifier; the key
    Date createdDate = {};                                 ///< when the document was taken over
    std::string contentType;                               ///< the whole "Content-Type" header value
    std::string userAgent;                                 ///< the whole "User-Agent" header value
    std::int64_t retries = 0;                              ///< how many attempts ended with a retry
    Date retryAfterDate = {};                              ///< when the latest of them ended
    std::optional<std::string> signature = std::string();  ///< reserved

    bool operator==(const SignedEntity&) const = default;
};

}  // namespace corvane
