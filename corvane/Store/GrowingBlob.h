#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace corvane {

/// Bytes that only ever grow at the end, before a constant suffix, and that are kept as the digits of their SQL
/// literal.
///
/// A row that is rewritten whenever something is added to it would otherwise render all its bytes each time; here an
/// addition costs its own bytes. Not thread-safe.
///
///     GrowingBlob events(R"({"events":[)", "]}");
///     events.append(R"({"n":1})");     // a row with {"events":[{"n":1}]} can be written
class GrowingBlob {
  public:
    explicit GrowingBlob(std::string_view prefix = {}, std::string_view suffix = {});

    /// Adds bytes between what is there and the suffix.
    void append(std::string_view bytes);

    /// How many bytes a row holds, the suffix included.
    [[nodiscard]] std::size_t size() const noexcept;
    /// How many characters the literal takes.
    [[nodiscard]] std::size_t sqlLiteralSize() const noexcept { return literal_.size() + suffix_.size(); }
    void appendSQLLiteral(std::string& out) const;

  private:
    std::string literal_;  // the literal up to the suffix
    std::string suffix_;   // the suffix's digits and the closing quote
};

}  // namespace corvane
