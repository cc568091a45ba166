#pragma once

// Internal: the tree behind JSON's typed views. Never included by a public header.

#include <corvane/Models/JSON.h>

#include <boost/json/value.hpp>

#include <optional>
#include <string>
#include <string_view>

namespace corvane::jsontree {

/// Parses UTF-8 JSON text; nothing when it is not JSON or nests deeper than `maximumDepth`. Integers stay integers,
/// and a floating-point number is the nearest double.
[[nodiscard]] std::optional<boost::json::value> parse(std::string_view text, int maximumDepth);

/// Writes a tree as text.
[[nodiscard]] std::string write(const boost::json::value& value, JSONWritingOptions options);

/// A tree as a person reads it: see JSON::description().
[[nodiscard]] std::string describe(const boost::json::value& value);

}  // namespace corvane::jsontree
