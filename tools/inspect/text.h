#pragma once

#include <corvane/Platform/Date.h>

#include <cstdint>
#include <string>
#include <string_view>

namespace inspect {

/// Text that a terminal shows as it is: what could move its cursor, turn its text around or is no UTF-8 stands as
/// "\x1b". What is stored came from elsewhere.
[[nodiscard]] std::string printable(std::string_view text);
/// "1 event", "2 events".
[[nodiscard]] std::string counted(std::uint64_t count, std::string_view what);
/// "4.2 KiB".
[[nodiscard]] std::string size(std::int64_t bytes);
/// "3 min": how long ago that was.
[[nodiscard]] std::string age(corvane::Date date);
/// JSON text on many lines, its numbers and strings as they stand; of strings only what a terminal must not see is
/// escaped.
[[nodiscard]] std::string indented(std::string_view json);
/// How many columns the text takes, one for each character.
[[nodiscard]] std::size_t width(std::string_view text);

}  // namespace inspect
