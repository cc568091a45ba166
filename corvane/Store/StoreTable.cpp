#include <corvane/Store/StoreTable.h>

#include <corvane/Platform/Require.h>

#include <algorithm>
#include <utility>

namespace corvane {

namespace {

std::string comparison(std::string opening, std::string_view column, const StorableValue& value) {
    opening.append(column).append(" = ");
    value.appendSQLLiteral(opening);
    return opening += ';';
}

}  // namespace

StoreTable::StoreTable(std::string_view name, std::vector<StoreColumn> columns)
    : name_(name), columns_(std::move(columns)) {
    insertOpening_ = "INSERT OR REPLACE INTO " + name_ + " (";
    const char* separator = "";
    for (const auto& column : columns_) {
        insertOpening_.append(separator).append(column.name);
        separator = ", ";
    }
    insertOpening_ += ") VALUES (";
}

std::string StoreTable::createSQL() const {
    std::string sql = "CREATE TABLE IF NOT EXISTS " + name_ + " (";
    const char* separator = "";
    for (const auto& column : columns_) {
        sql.append(separator).append(column.name).append(" ").append(column.type);
        if (!column.nullable) sql += " NOT NULL";
        separator = ", ";
    }
    for (const auto& column : columns_) {
        if (column.primary) sql.append(separator).append("PRIMARY KEY (").append(column.name).append(")");
    }
    return sql += ");";
}

std::string StoreTable::dropSQL() const {
    return "DROP TABLE IF EXISTS " + name_ + ";";
}

std::string StoreTable::insertSQL(const std::vector<StorableValue>& values) const {
    CORVANE_REQUIRE(values.size() == columns_.size(), "a row of " + name_ + " needs one value for each column");
    std::size_t size = insertOpening_.size() + 2;
    for (const auto& value : values) size += value.sqlLiteralSizeHint() + 2;
    std::string sql;
    sql.reserve(size);
    sql += insertOpening_;
    const char* separator = "";
    for (const auto& value : values) {
        sql += separator;
        value.appendSQLLiteral(sql);
        separator = ", ";
    }
    return sql += ");";
}

std::string StoreTable::selectSQL() const {
    return "SELECT * FROM " + name_ + ";";
}

std::string StoreTable::keysSQL() const {
    const auto key =
        std::find_if(columns_.begin(), columns_.end(), [](const StoreColumn& column) { return column.primary; });
    CORVANE_REQUIRE(key != columns_.end(), "the table " + name_ + " has no key");
    // The sign keeps the database from walking through the table, whose rows may be large: the key's index has all of
    // it.
    return "SELECT " + key->name + " FROM " + name_ + " ORDER BY +rowid;";
}

std::string StoreTable::selectSQL(std::string_view column, const StorableValue& value) const {
    return comparison("SELECT * FROM " + name_ + " WHERE ", column, value);
}

std::string StoreTable::deleteSQL(std::string_view column, const StorableValue& value) const {
    return comparison("DELETE FROM " + name_ + " where ", column, value);
}

}  // namespace corvane
