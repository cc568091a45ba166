#include <corvane/Store/StoreStepper.h>

#include <sqlite3.h>

namespace corvane {

namespace {

[[noreturn]] void throwBadColumn(int column, const char* missing) {
    throw StoreStepperError(StoreStepperError::badColumn, "column " + std::to_string(column) + " holds no " + missing);
}

std::string message(StoreStepperError::Code code, const std::string& detail) {
    return (code == StoreStepperError::badColumn ? "bad column: " : "bad data in column: ") + detail;
}

}  // namespace

StoreStepperError::StoreStepperError(Code code, const std::string& detail)
    : Error("Corvane.StoreStepper.Errors", code, message(code, detail)) {}
StoreStepperError::~StoreStepperError() = default;

int StoreStepper::take() {
    const int column = index_++;
    if (!statement_) throwBadColumn(column, "value, for there is no row");
    return column;
}

std::optional<std::string> StoreStepper::optionalText() {
    const int column = take();
    const auto* text = reinterpret_cast<const char*>(sqlite3_column_text(statement_, column));
    if (!text) return std::nullopt;
    return std::string(text, static_cast<std::size_t>(sqlite3_column_bytes(statement_, column)));
}

std::string StoreStepper::text() {
    auto text = optionalText();
    if (!text) throwBadColumn(index_ - 1, "text");
    return *std::move(text);
}

std::int64_t StoreStepper::integer() {
    const int column = take();
    return sqlite3_column_int64(statement_, column);
}

std::int64_t StoreStepper::count() {
    const auto number = integer();
    return number >= 0 && number <= largestCount ? number : 0;
}

double StoreStepper::double_() {
    const int column = take();
    return sqlite3_column_double(statement_, column);
}

std::string StoreStepper::bytes() {
    const int column = take();
    const auto* bytes = static_cast<const char*>(sqlite3_column_blob(statement_, column));
    if (!bytes) throwBadColumn(column, "bytes");
    return {bytes, static_cast<std::size_t>(sqlite3_column_bytes(statement_, column))};
}

}  // namespace corvane
