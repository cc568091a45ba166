#pragma once

#include <corvane/Platform/Error.h>

#include <cstdint>
#include <optional>
#include <string>

struct sqlite3_stmt;

namespace corvane {

/// A result row is not what the entity needs: `StoreStepper::Errors`. Domain "Corvane.StoreStepper.Errors".
class StoreStepperError : public Error {
  public:
    enum Code {
        badColumn = 0,        ///< the column holds no text or no bytes where some are needed
        badDataInColumn = 1,  ///< the column's contents do not decode as the entity requires
    };
    /// @param detail which column or what about it, for the message.
    StoreStepperError(Code code, const std::string& detail);
    StoreStepperError(const StoreStepperError&) = default;
    StoreStepperError& operator=(const StoreStepperError&) = default;
    ~StoreStepperError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
};

/// Reads one result row, column by column in table order. Every read takes the next column, whether it succeeds or
/// throws.
///
/// Good for the length of the call that it is passed to.
class StoreStepper {
  public:
    using Errors = StoreStepperError;

    /// @param statement the prepared statement that stands on a row, as the database connection holds it; nullptr for
    /// no row, which makes every read throw.
    explicit StoreStepper(sqlite3_stmt* statement) noexcept : statement_(statement) {}

    /// The next column's text. Throws `badColumn` for NULL.
    [[nodiscard]] std::string text();
    /// The next column's text, or nothing for NULL.
    [[nodiscard]] std::optional<std::string> optionalText();
    /// The next column as an integer, converted as the database converts; NULL is 0.
    [[nodiscard]] std::int64_t integer();
    /// The next column as a count of something: 0 for what can be none, as in a damaged row. Sums of counts fit.
    [[nodiscard]] std::int64_t count();
    static constexpr std::int64_t largestCount = std::int64_t{1} << 48;
    /// The next column as a floating-point number, converted as the database converts; NULL is 0.
    [[nodiscard]] double double_();
    /// The next column's bytes. Throws `badColumn` for NULL and for no bytes at all.
    [[nodiscard]] std::string bytes();

    /// The column that is read next, counted from 0.
    [[nodiscard]] std::int32_t index() const noexcept { return index_; }

  private:
    /// The index of the column to read now. Throws `badColumn` when there is no row.
    int take();

    std::int32_t index_ = 0;
    sqlite3_stmt* statement_;
};

}  // namespace corvane
