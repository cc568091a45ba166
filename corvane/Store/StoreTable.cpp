#include <corvane/Store/StoreTable.h>

#include <corvane/Platform/Require.h>
#include <corvane/Store/StoreStepper.h>

#include <algorithm>
#include <utility>

namespace corvane {

namespace {

std::string comparison(std::string opening, std::string_view column, const StorableValue& value) {
    opening.append(column).append(" = ");
    value.appendSQLLiteral(opening);
    return opening += ';';
}

// As StoreStepper::count reads it: a damaged number must neither end a sum nor be added to for good.
std::string countOf(const std::string& column) {
    return "CASE WHEN " + column + " BETWEEN 0 AND " + std::to_string(StoreStepper::largestCount) + " THEN " + column +
           " ELSE 0 END";
}

}  // namespace

StoreTable::StoreTable(std::string_view name, std::vector<StoreColumn> columns, StoreTableExtras extras)
    : name_(name), columns_(std::move(columns)), extras_(std::move(extras)) {
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
    return sql += extras_.isIndexOnly ? ") WITHOUT ROWID;" : ");";
}

std::string StoreTable::dropSQL() const {
    return "DROP TABLE IF EXISTS " + name_ + ";";
}

std::vector<StorableValue> StoreTable::values(FunctionRef<StorableValue(const std::string&)> valueOf) const {
    std::vector<StorableValue> values;
    values.reserve(columns_.size());
    for (const auto& column : columns_) values.push_back(valueOf(column.name));
    return values;
}

std::string StoreTable::deleteAllSQL() const {
    return "DELETE FROM " + name_ + ";";
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

const StoreColumn& StoreTable::key() const {
    const auto found =
        std::find_if(columns_.begin(), columns_.end(), [](const StoreColumn& column) { return column.primary; });
    CORVANE_REQUIRE(found != columns_.end(), "the table " + name_ + " has no key");
    return *found;
}

std::string StoreTable::addSQL(const std::vector<StorableValue>& values) const {
    std::string sql = insertSQL(values);
    constexpr std::string_view replace = " OR REPLACE";
    sql.erase(sql.find(replace), replace.size());
    sql.back() = ' ';  // the semicolon
    sql.append("ON CONFLICT (").append(key().name).append(") DO UPDATE SET ");
    const char* separator = "";
    for (const auto& column : columns_) {
        if (column.primary) continue;
        sql.append(separator).append(column.name).append(" = ").append(countOf(column.name));
        sql.append(" + excluded.").append(column.name);
        separator = ", ";
    }
    return sql += ';';
}

std::string StoreTable::sumsSQL() const {
    std::string sql = "SELECT count(*)";
    for (const auto& column : columns_) {
        if (column.type == "INTEGER") sql.append(", sum(").append(countOf(column.name)).append(")");
    }
    return sql.append(" FROM ").append(name_).append(";");
}

std::string StoreTable::keysSQL() const {
    // The sign keeps the database from walking through the table, whose rows may be large: the key's index has all of
    // it.
    return "SELECT " + key().name + " FROM " + name_ + " ORDER BY +rowid;";
}

std::string StoreTable::selectSQL(std::string_view column, const StorableValue& value) const {
    return comparison("SELECT * FROM " + name_ + " WHERE ", column, value);
}

std::string StoreTable::takeSQL(std::string_view column, const StorableValue& value) const {
    auto sql = deleteSQL(column, value);
    sql.back() = ' ';  // the semicolon
    return sql += "RETURNING *;";
}

std::string StoreTable::deleteSQL(std::string_view column, const StorableValue& value) const {
    return comparison("DELETE FROM " + name_ + " where ", column, value);
}

}  // namespace corvane
