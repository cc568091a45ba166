#pragma once

#include <concepts>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <variant>

namespace corvane {

class GrowingBlob;

/// A value that can stand in an SQL statement. It is the only way for a value to get into one.
///
/// A value, except that a growing blob is referred to and must outlive it.
class StorableValue {
  public:
    // Implicit, so that an entity returns its fields as they are.
    StorableValue(std::string text);                           // NOLINT(google-explicit-constructor)
    StorableValue(std::string_view text);                      // NOLINT(google-explicit-constructor)
    StorableValue(const char* text);                           // NOLINT(google-explicit-constructor)
    StorableValue(const std::optional<std::string>& text);     // NOLINT(google-explicit-constructor)
    StorableValue(double number) : value_(number) {}           // NOLINT(google-explicit-constructor)
    StorableValue(const GrowingBlob& blob) : value_(&blob) {}  // NOLINT(google-explicit-constructor)
    StorableValue(GrowingBlob&& blob) = delete;
    template <std::signed_integral I>
    StorableValue(I number) : value_(static_cast<std::int64_t>(number)) {}  // NOLINT(google-explicit-constructor)

    [[nodiscard]] static StorableValue bytes(std::string bytes);
    /// What a nullable column without a value holds.
    [[nodiscard]] static StorableValue absent();

    /// Appends the value as an SQL literal: text in single quotes, bytes as x'..', numbers in their shortest decimals
    /// that read back the same (always with a point or an exponent when they are floating-point), NULL. Throws
    /// `InvalidArgument` for text that holds NUL, which SQL text cannot, and for a number that is not finite; `out` is
    /// then unchanged.
    void appendSQLLiteral(std::string& out) const;
    [[nodiscard]] std::string sqlLiteral() const;

    /// About how many characters the literal takes, for reserving room.
    [[nodiscard]] std::size_t sqlLiteralSizeHint() const noexcept;

  private:
    struct Bytes {
        std::string bytes;
    };
    using Value = std::variant<std::monostate, std::string, std::int64_t, double, Bytes, const GrowingBlob*>;

    StorableValue() = default;

    Value value_;
};

}  // namespace corvane
