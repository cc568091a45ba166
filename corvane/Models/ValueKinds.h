#pragma once

#include <corvane/Models/Encoder.h>

#include <chrono>
#include <concepts>
#include <ctime>
#include <initializer_list>
#include <optional>
#include <ranges>
#include <string_view>
#include <type_traits>

// What a host type is to the encoders. Internal.

#pragma GCC visibility push(hidden)  // what is made of host types belongs to the object that makes it

namespace corvane::detail {

template <class T>
inline constexpr bool isOptional = false;
template <class T>
inline constexpr bool isOptional<std::optional<T>> = true;

template <class T>
inline constexpr bool isSystemTime = false;
template <class D>
inline constexpr bool isSystemTime<std::chrono::time_point<std::chrono::system_clock, D>> = true;

template <class T>
inline constexpr bool isDuration = false;
template <class Rep, class Period>
inline constexpr bool isDuration<std::chrono::duration<Rep, Period>> = true;

template <class T>
inline constexpr bool isInitializerList = false;
template <class T>
inline constexpr bool isInitializerList<std::initializer_list<T>> = true;

template <class T>
concept EncodesItself = requires(const T& value, Encoder& encoder) {
    value.encode(encoder);
};

template <class T>
concept TextEnumeration = std::is_enum_v<T> && requires(T value) {
    { toText(value) } -> std::convertible_to<std::string_view>;
};

template <class T>
concept Character = std::same_as<T, char> || std::same_as<T, wchar_t> || std::same_as<T, char8_t> ||
    std::same_as<T, char16_t> || std::same_as<T, char32_t>;

/// An array of characters: text that ends at the first zero, or with the array.
template <class T>
concept TextArray = std::is_bounded_array_v<T> &&(std::same_as<std::remove_cv_t<std::remove_extent_t<T>>, char> ||
                                                  std::same_as<std::remove_cv_t<std::remove_extent_t<T>>, char8_t>);

template <class T>
concept UTF8Text = std::convertible_to<const T&, std::u8string_view>;
template <class T>
concept Text = std::convertible_to<const T&, std::string_view> || UTF8Text<T>;
template <class T>
concept WideText = std::convertible_to<const T&, std::wstring_view> ||
    std::convertible_to<const T&, std::u16string_view> || std::convertible_to<const T&, std::u32string_view>;

template <class T>
concept Map = std::ranges::range<const T> && requires {
    typename T::key_type;
    typename T::mapped_type;
};
template <class T>
concept StringMap = Map<T> && std::convertible_to<const typename T::key_type&, std::string_view>;

/// A map that may hold a key twice has nothing but an iterator to say of an insertion.
template <class T>
concept RepeatsKeys = requires(T& map, const typename T::value_type& entry) {
    { map.insert(entry) } -> std::same_as<typename T::iterator>;
};

/// What refers to a value that is somebody else's.
template <class T>
concept View = std::is_pointer_v<T> || std::ranges::view<T> || isInitializerList<T>;

/// Stands in for an enumeration where its `toText` may have been put by mistake: beside the record that holds it, in
/// the global namespace, in the library's.
template <class Enum, class Record, class Global = std::tm, class Library = Encoder>
struct EnumerationAbroad {
    template <class T>
    requires std::same_as<std::remove_const_t<T>, Enum>
    operator T() const noexcept;  // NOLINT(google-explicit-constructor): declared only
};
/// Is taken there by a template that takes everything, which says nothing of the enumeration.
template <class Record, class Global = std::tm, class Library = Encoder>
struct NoEnumeration {};

template <class Enum, class Record>
concept TextEnumerationAbroad = requires(EnumerationAbroad<Enum, Record> value) {
    toText(value);
}
&&!requires(NoEnumeration<Record> nothing) {
    toText(nothing);
};

}  // namespace corvane::detail

#pragma GCC visibility pop
