#pragma once

#include <corvane/Export.h>

#include <cstdint>
#include <string>
#include <string_view>

namespace corvane::jsontext {

/// How deep objects and arrays may nest in anything the library writes, the outermost one counted.
inline constexpr int maximumDepth = 128;

/// Appends `text` as a JSON string with its quotes. Returns false, having appended nothing, when it is not UTF-8.
[[nodiscard]] CORVANE_EXPORT bool appendString(std::string& out, std::string_view text);

/// Whether `text` is well-formed UTF-8.
[[nodiscard]] CORVANE_EXPORT bool isUTF8(std::string_view text);

/// Appends the shortest decimal that reads back as the same number and is recognisable as a floating-point one ("3.0",
/// "1e+300"). Returns false, having appended nothing, when the number is not finite.
[[nodiscard]] CORVANE_EXPORT bool appendDouble(std::string& out, double number);
/// The same for a float, whose own shortest decimal is shorter than that of the double it converts to.
[[nodiscard]] CORVANE_EXPORT bool appendFloat(std::string& out, float number);

/// How deep objects and arrays nest in JSON text, the outermost one counted.
[[nodiscard]] CORVANE_EXPORT int nesting(std::string_view text);

CORVANE_EXPORT void appendInteger(std::string& out, std::int64_t number);
CORVANE_EXPORT void appendUnsigned(std::string& out, std::uint64_t number);

}  // namespace corvane::jsontext
