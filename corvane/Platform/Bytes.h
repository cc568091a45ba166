#pragma once

#include <string>
#include <string_view>

namespace corvane {

/// Appends two lower-case hexadecimal digits per byte, with no separators.
void appendHexDigits(std::string& out, std::string_view bytes);
/// Two lower-case hexadecimal digits per byte: "000fa0".
[[nodiscard]] std::string hexString(std::string_view bytes);

/// Standard base64 with padding and without line breaks.
[[nodiscard]] std::string base64String(std::string_view bytes);

/// Whether `text` holds a character that would end a header or hide in one: a C0 control or DEL.
[[nodiscard]] bool holdsControlCharacter(std::string_view text);

}  // namespace corvane
