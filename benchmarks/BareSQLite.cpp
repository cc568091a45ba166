#include "benchmarks/BareSQLite.h"

#include <stdexcept>

namespace corvane::bench {

BareSQLite::BareSQLite(const std::filesystem::path& file) {
    sqlite3* database = nullptr;
    if (sqlite3_open(file.c_str(), &database) != SQLITE_OK) throw std::runtime_error(sqlite3_errmsg(database));
    database_.reset(database);
    run("PRAGMA journal_mode=WAL;");
    run("PRAGMA synchronous=NORMAL;");
    run("CREATE TABLE batches (identifier TEXT PRIMARY KEY NOT NULL, events DATA NOT NULL, session DATA NOT NULL);");
}

void BareSQLite::run(const std::string& sql) {
    sqlite3_stmt* statement = nullptr;
    if (sqlite3_prepare_v2(database_.get(), sql.c_str(), -1, &statement, nullptr) != SQLITE_OK) {
        throw std::runtime_error(sqlite3_errmsg(database_.get()));
    }
    const int result = sqlite3_step(statement);
    sqlite3_finalize(statement);
    if (result != SQLITE_DONE && result != SQLITE_ROW) throw std::runtime_error(sqlite3_errmsg(database_.get()));
}

std::string BareSQLite::rowOf(const std::string& hexDigits) {
    std::string sql =
        "INSERT OR REPLACE INTO batches (identifier, events, session) VALUES ("
        "'7E7C6B0E-0000-4000-8000-000000000001', X'";
    sql += hexDigits;
    sql +=
        "', X'7B2273657373696F6E4944223A2237453743364230452D303030302D343030302D383030302D303030303030303030303031"
        "227D');";
    return sql;
}

std::string BareSQLite::deletionOfRow() {
    return "DELETE FROM batches WHERE identifier = '7E7C6B0E-0000-4000-8000-000000000001';";
}

}  // namespace corvane::bench
