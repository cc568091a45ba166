#pragma once

// Internal: never included by a public header.

#include <cstddef>
#include <optional>
#include <string_view>

namespace corvane::jsonshape {

/// How many objects an array holds whose text stands between `opening` and `closing`: `{"events":[` and `]}`, say.
/// Nothing unless all of `text` is one JSON value of at most 512 levels, an object with one key, whose value is an
/// array of objects, laid out so that what stands between the two is the array's elements as they were written. Builds
/// no tree.
[[nodiscard]] std::optional<std::size_t> objectsBetween(std::string_view text, std::string_view opening,
                                                        std::string_view closing);

}  // namespace corvane::jsonshape
