#pragma once

#include <corvane/Store/StoreStepperError.h>

#include <cstdint>
#include <optional>
#include <string>

namespace corvane {

/// Reads one result row, column by column in table order. Every read takes the next column, whether it succeeds or
/// throws.
///
/// Good for the length of the call that it is passed to.
class StoreStepper {
  public:
    using Errors = StoreStepperError;

    /// @param statement the prepared statement that stands on a row, as the database connection holds it; nullptr for
    /// no row, which makes every read throw.
    explicit StoreStepper(void* statement) noexcept : statement_(statement) {}

    /// The next column's text. Throws `badColumn` for NULL.
    [[nodiscard]] std::string text();
    /// The next column's text, or nothing for NULL.
    [[nodiscard]] std::optional<std::string> optionalText();
    /// The next column as an integer, converted as the database converts; NULL is 0.
    [[nodiscard]] std::int64_t integer();
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
    void* statement_;
};

}  // namespace corvane
