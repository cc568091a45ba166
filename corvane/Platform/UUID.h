#pragma once

#include <string>
#include <string_view>

namespace corvane {

/// A new random UUID in its upper-case text form of 36 characters. Callable from any thread.
[[nodiscard]] std::string newUUID();
/// Appends one.
void appendUUID(std::string& out);

/// Whether `text` has the form of one: 36 characters, upper-case hexadecimal digits in groups of 8, 4, 4, 4 and 12.
[[nodiscard]] bool isUUID(std::string_view text) noexcept;

}  // namespace corvane
