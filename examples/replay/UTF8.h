#pragma once

#include <string>
#include <string_view>

namespace replay {

/// The text with U+FFFD in place of every byte sequence that is not UTF-8: one for each longest beginning of a
/// character, as browsers do it.
[[nodiscard]] std::string repairedUTF8(std::string_view text);

}  // namespace replay
