#pragma once

#include <functional>
#include <string>
#include <string_view>
#include <unordered_map>

namespace corvane {

/// Lets a map with string keys be searched by a view, without making a string.
struct StringHash {
    using is_transparent = void;
    std::size_t operator()(std::string_view text) const noexcept { return std::hash<std::string_view>{}(text); }
};

template <class T>
using StringMap = std::unordered_map<std::string, T, StringHash, std::equal_to<>>;

}  // namespace corvane
