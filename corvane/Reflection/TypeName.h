#pragma once

#include <corvane/Export.h>

#include <array>
#include <cstddef>
#include <string_view>

#pragma GCC visibility push(hidden)  // what is made of host types belongs to the object that makes it

namespace corvane {

namespace detail {

template <class T>
consteval const char* prettyType() {
    return __PRETTY_FUNCTION__;
}

// The part of the compiler's text that names the type: "... [with T = <type>]" or "... [T = <type>]".
consteval std::string_view typeText(std::string_view pretty) {
    const std::size_t begin = pretty.find("T = ");
    return pretty.substr(begin + 4, pretty.size() - begin - 5);
}

template <std::size_t Capacity>
struct Name {
    std::array<char, Capacity> text{};
    std::size_t size = 0;
};

// Keeps the last component of a qualified name, and of each template argument. What stands before "::" is dropped
// back to where the component began, parenthesised parts (functions, anonymous namespaces) included.
template <std::size_t Capacity>
consteval Name<Capacity> lastComponents(std::string_view qualified) {
    Name<Capacity> name;
    std::array<std::size_t, 64> starts{};  // where the component at each level of <> and () began
    std::size_t level = 0;
    for (std::size_t i = 0; i < qualified.size(); ++i) {
        const char c = qualified[i];
        if (c == ':' && i + 1 < qualified.size() && qualified[i + 1] == ':') {
            name.size = starts[level];
            ++i;
            continue;
        }
        if ((c == '>' || c == ')') && level > 0) --level;
        // Some compilers part closing brackets by a blank; the name is the same.
        if (c == '>' && name.size > 0 && name.text[name.size - 1] == ' ') --name.size;
        name.text[name.size++] = c;
        if (c == '<' || c == '(') {
            starts[++level] = name.size;
        } else if (c == ',' || c == ' ') {
            starts[level] = name.size;
        }
    }
    return name;
}

template <class T>
CORVANE_LOCAL inline constexpr auto reducedTypeName =
    lastComponents<typeText(prettyType<T>()).size() + 1>(typeText(prettyType<T>()));

}  // namespace detail

/// The name of a type as events and data carry it: the last component of its name, template arguments reduced the same
/// way, or the type's own static member `typeName` where it has one. Two types of one name share it.
template <class T>
[[nodiscard]] constexpr std::string_view typeName() {
    if constexpr (requires { std::string_view(T::typeName); }) {
        return T::typeName;
    } else {
        return {detail::reducedTypeName<T>.text.data(), detail::reducedTypeName<T>.size};
    }
}

}  // namespace corvane

#pragma GCC visibility pop
