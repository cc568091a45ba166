#pragma once

#include <corvane/Store/StorableValue.h>
#include <corvane/Store/StoreColumn.h>

#include <string>
#include <string_view>
#include <vector>

namespace corvane {

/// The statements of one table. The only place where statement text is made; values get into it as literals of
/// `StorableValue`. Constant after construction; safe from any thread.
class StoreTable {
  public:
    StoreTable(std::string_view name, std::vector<StoreColumn> columns);

    [[nodiscard]] const std::string& name() const noexcept { return name_; }
    [[nodiscard]] const std::vector<StoreColumn>& columns() const noexcept { return columns_; }

    [[nodiscard]] std::string createSQL() const;
    [[nodiscard]] std::string dropSQL() const;
    /// @param values one for each column, in table order. Throws `InvalidArgument` when one cannot be written.
    [[nodiscard]] std::string insertSQL(const std::vector<StorableValue>& values) const;
    [[nodiscard]] std::string selectSQL() const;
    /// Selects the key column alone. Requires: the table has one.
    [[nodiscard]] std::string keysSQL() const;
    /// Throws `InvalidArgument` when the value cannot be written.
    [[nodiscard]] std::string selectSQL(std::string_view column, const StorableValue& value) const;
    /// Throws `InvalidArgument` when the value cannot be written.
    [[nodiscard]] std::string deleteSQL(std::string_view column, const StorableValue& value) const;

  private:
    std::string name_;
    std::vector<StoreColumn> columns_;
    std::string insertOpening_;  // up to the first value
};

}  // namespace corvane
