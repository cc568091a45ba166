#pragma once

#include <corvane/Platform/ForgottenRecords.h>
#include <corvane/Platform/FunctionRef.h>
#include <corvane/Store/StorableValue.h>
#include <corvane/Store/StoreColumn.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

class StoreConnection;

/// What an entity has beside its own columns.
struct StoreTableExtras {
    /// Whether a row lies in its key's index alone: one page is written with it, not two, but rows have no order.
    bool isIndexOnly = false;
    /// Statements that create further tables, which whoever writes this one needs too.
    std::vector<std::string> companions = {};
    /// Notes what all records hold before they are forgotten, inside the transaction; may be empty.
    std::function<ForgottenRecords(const std::shared_ptr<StoreConnection>&)> willForget = {};
};

/// The statements of one table. The only place where statement text is made; values get into it as literals of
/// `StorableValue`. Constant after construction; safe from any thread.
class StoreTable {
  public:
    StoreTable(std::string_view name, std::vector<StoreColumn> columns, StoreTableExtras extras = {});

    [[nodiscard]] const std::string& name() const noexcept { return name_; }
    [[nodiscard]] const std::vector<StoreColumn>& columns() const noexcept { return columns_; }

    [[nodiscard]] std::string createSQL() const;
    [[nodiscard]] const StoreTableExtras& extras() const noexcept { return extras_; }
    [[nodiscard]] std::string dropSQL() const;
    /// One value for each column, in table order.
    [[nodiscard]] std::vector<StorableValue> values(FunctionRef<StorableValue(const std::string&)> valueOf) const;
    [[nodiscard]] std::string deleteAllSQL() const;
    /// @param values one for each column, in table order. Throws `InvalidArgument` when one cannot be written.
    [[nodiscard]] std::string insertSQL(const std::vector<StorableValue>& values) const;
    [[nodiscard]] std::string selectSQL() const;
    /// Selects the key column alone. Requires: the table has one.
    [[nodiscard]] std::string keysSQL() const;
    /// As `deleteSQL`, and selects what it deletes.
    [[nodiscard]] std::string takeSQL(std::string_view column, const StorableValue& value) const;
    /// Throws `InvalidArgument` when the value cannot be written.
    [[nodiscard]] std::string selectSQL(std::string_view column, const StorableValue& value) const;
    /// @param values as with `insertSQL`. Adds the numbers, which are counts, to those of a row that has the key
    /// already.
    [[nodiscard]] std::string addSQL(const std::vector<StorableValue>& values) const;
    /// Selects the number of rows and the sums of the columns of type INTEGER, which are counts.
    [[nodiscard]] std::string sumsSQL() const;
    /// Throws `InvalidArgument` when the value cannot be written.
    [[nodiscard]] std::string deleteSQL(std::string_view column, const StorableValue& value) const;

  private:
    [[nodiscard]] const StoreColumn& key() const;

    std::string name_;
    std::vector<StoreColumn> columns_;
    StoreTableExtras extras_;
    std::string insertOpening_;  // up to the first value
};

}  // namespace corvane
