#include <corvane/Store/StoreError.h>

#include <utility>

namespace corvane {

namespace {

std::string withoutValues(std::string_view sql) {
    const std::size_t quote = sql.find('\'');
    return quote == std::string_view::npos ? std::string(sql) : std::string(sql.substr(0, quote)) + "...";
}

std::string statementMessage(std::string_view failure, std::string_view reason, std::string_view sql) {
    return std::string(failure).append(": ").append(reason).append(", statement: ").append(withoutValues(sql));
}

}  // namespace

StoreError::StoreError(Code code, std::string message) : Error("Corvane.Store.Errors", code, std::move(message)) {}
StoreError::~StoreError() = default;

StoreError StoreError::makeCantOpen(StoreLocation location, std::string_view reason) {
    StoreError error(cantOpen, "cannot open the database at " + location.description() + ": " + std::string(reason));
    error.location_ = std::move(location);
    return error;
}

StoreError StoreError::makePrepare(std::string sql, std::string_view reason) {
    StoreError error(prepare, statementMessage("cannot prepare a statement", reason, sql));
    error.sql_ = std::move(sql);
    return error;
}

StoreError StoreError::makeExecute(std::string sql, std::string_view reason) {
    StoreError error(execute, statementMessage("cannot execute a statement", reason, sql));
    error.sql_ = std::move(sql);
    return error;
}

StoreError StoreError::makeMissingHandle() {
    return {missingHandle, "the database is not open"};
}

}  // namespace corvane
