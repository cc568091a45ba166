#pragma once

#include <corvane/Export.h>
#include <corvane/Reflection/TieFields.h>
#include <corvane/Reflection/TypeName.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <string_view>
#include <type_traits>
#include <utility>

// Field reflection over plain aggregates, at compile time and without registration: how many fields a type has, what
// they are called, and references to them in declaration order. Everything here is consteval or a plain template, so
// nothing of it is left in the host's program but the names.

#pragma GCC visibility push(hidden)  // what is made of host types belongs to the object that makes it

namespace corvane::reflection {

namespace detail {

// Converts to whatever a field is. Const, so that a field's own converting constructor wins where both would do.
struct AnyField {
    template <class T>
    operator T() const noexcept;  // NOLINT(google-explicit-constructor): declared only
};

// Fields have addresses of their own, so a type has no more of them than bytes.
template <class T>
inline constexpr std::size_t mostFields = sizeof(T) < maximumFields ? sizeof(T) : maximumFields;

// Converts to an anonymous union, which structured bindings cannot take apart.
template <class T>
concept AnonymousUnion = std::is_union_v<T> &&
    (corvane::detail::typeText(corvane::detail::prettyType<T>()).ends_with("<unnamed union>") ||
     corvane::detail::typeText(corvane::detail::prettyType<T>()).find("(anonymous union at") != std::string_view::npos);

struct AnyAnonymousUnion {
    template <AnonymousUnion T>
    operator T() const noexcept;  // NOLINT(google-explicit-constructor): declared only
};

// What alone binds to a reference that is not const.
struct AnyVariable {
    template <class T>
    operator T&() const noexcept;  // NOLINT(google-explicit-constructor): declared only
};

template <class T, class Value, std::size_t... I>
consteval bool takes(std::index_sequence<I...>) {
    return requires {
        T{(static_cast<void>(I), Value{})...};
    };
}

template <class T, std::size_t N>
consteval std::size_t countFrom() {
    if constexpr (N == 0) {
        return 0;
    } else if constexpr (takes<T, AnyField>(std::make_index_sequence<N>())) {
        return N;
    } else {
        return countFrom<T, N - 1>();
    }
}

template <class T>
struct AnyBaseOf {
    template <class Base>
    requires(std::is_base_of_v<Base, T> && !std::is_same_v<Base, T>) operator Base()
        const noexcept;  // NOLINT(google-explicit-constructor): declared only
};

template <class T>
concept HasBase = requires {
    T{AnyBaseOf<T>{}};
};

// An array without its own braces takes as many values as it has elements, and so upsets the count. One that is given
// its braces takes one value only: then what follows is too much.
template <class T, std::size_t... Before, std::size_t... After>
consteval bool isArrayAt(std::index_sequence<Before...>, std::index_sequence<After...>) {
    return requires {
        T{(static_cast<void>(Before), AnyField{})..., {}};
    }
    &&!requires {
        T{(static_cast<void>(Before), AnyField{})..., {}, (static_cast<void>(After), AnyField{})...};
    };
}

// Where the first array is among `N` values; `N` when there is none.
template <class T, std::size_t N, std::size_t... I>
consteval std::size_t firstArray(std::index_sequence<I...>) {
    const std::array<bool, N> isArray{
        isArrayAt<T>(std::make_index_sequence<I>(), std::make_index_sequence<N - 1 - I>())...};
    return static_cast<std::size_t>(std::find(isArray.begin(), isArray.end(), true) - isArray.begin());
}

template <class T, std::size_t... Before, std::size_t... After>
consteval bool isAnonymousUnionAt(std::index_sequence<Before...>, std::index_sequence<After...>) {
    return requires {
        T{(static_cast<void>(Before), AnyField{})..., AnyAnonymousUnion{}, (static_cast<void>(After), AnyField{})...};
    };
}

template <class T, std::size_t N, std::size_t... I>
consteval bool hasAnonymousUnion(std::index_sequence<I...>) {
    return (isAnonymousUnionAt<T>(std::make_index_sequence<I>(), std::make_index_sequence<N - 1 - I>()) || ...);
}

template <class T, std::size_t... I>
consteval bool takesVariables(std::index_sequence<I...>) {
    return (takes<T, AnyVariable>(std::make_index_sequence<I + 1>()) || ...);
}

/// Why a type cannot be taken apart.
enum class Obstacle { none, notAnAggregate, base, tooManyFields, array, anonymousUnion, reference, unknown };

template <class T>
consteval Obstacle obstacle() {
    if constexpr (!std::is_class_v<T> || !std::is_aggregate_v<T> || !std::is_destructible_v<T>) {
        return Obstacle::notAnAggregate;
    } else if constexpr (std::is_empty_v<T>) {
        return Obstacle::none;
    } else if constexpr (HasBase<T>) {
        return Obstacle::base;
    } else {
        constexpr std::size_t count = countFrom<T, mostFields<T>>();
        if constexpr (count == 0) {
            return takesVariables<T>(std::make_index_sequence<8>()) ? Obstacle::reference : Obstacle::unknown;
        } else if constexpr (firstArray<T, count>(std::make_index_sequence<count>()) < count) {
            return Obstacle::array;
        } else if constexpr (takes<T, AnyField>(std::make_index_sequence<maximumFields + 1>())) {
            return Obstacle::tooManyFields;
        } else if constexpr (hasAnonymousUnion<T, count>(std::make_index_sequence<count>())) {
            return Obstacle::anonymousUnion;
        } else {
            return Obstacle::none;
        }
    }
}

// An object that is never defined: its subobjects have addresses, and an address has a name.
template <class T>
struct Wrapper {
    T value;
};

#if defined(__clang__)
#pragma clang diagnostic push
#pragma clang diagnostic ignored "-Wundefined-var-template"
#pragma clang diagnostic ignored "-Wundefined-internal"
#endif

template <class T>
extern const Wrapper<T> object;

template <class P>
struct Address {
    P pointer;
};

template <class P>
Address(P) -> Address<P>;

template <Address A>
consteval const char* pretty() {  // a plain pointer: gcc spells an alias out at the end of the text
    return __PRETTY_FUNCTION__;
}

// gcc ends in "...::Screen::name}]", clang in "...value.name}]".
consteval std::string_view lastName(std::string_view text) {
    const std::size_t end = text.find_last_not_of("]})>; ") + 1;
    const std::size_t begin = text.find_last_of(".:&", end - 1) + 1;
    return text.substr(begin, end - begin);
}

template <class T, std::size_t N, std::size_t I>
consteval std::string_view fieldName() {
    return lastName(pretty<Address{&std::get<I>(tieFields<N>(object<T>.value))}>());
}

/// Whether all fields have addresses of their own, and so names: a reference and a bit-field have none.
template <class T, std::size_t N>
inline constexpr bool haveAddresses = N == 0 || requires {
    pretty<Address{&std::get<0>(tieFields<N>(object<T>.value))}>();
};

template <class T, std::size_t N, std::size_t... I>
consteval auto collectNames(std::index_sequence<I...>) {
    return std::array<std::string_view, N>{fieldName<T, N, I>()...};
}

#if defined(__clang__)
#pragma clang diagnostic pop
#endif

// How many values the array at a place takes.
template <class T, std::size_t Most, std::size_t... Before, std::size_t... Elements>
consteval std::size_t countElements(std::index_sequence<Before...> before, std::index_sequence<Elements...>) {
    if constexpr (requires {
                      T{(static_cast<void>(Before), AnyField{})..., {(static_cast<void>(Elements), AnyField{})...}};
                  }) {
        return sizeof...(Elements);
    } else {
        return countElements<T, Most>(before, std::make_index_sequence<sizeof...(Elements) - 1>());
    }
}

// How many fields take the values from `Place` on, arrays counted as one.
template <class T, std::size_t Values, std::size_t Place>
consteval std::size_t countFieldsFrom() {
    if constexpr (Place >= Values) {
        return 0;
    } else if constexpr (isArrayAt<T>(std::make_index_sequence<Place>(),
                                      std::make_index_sequence<Values - 1 - Place>())) {
        constexpr std::size_t size =
            countElements<T, Values>(std::make_index_sequence<Place>(), std::make_index_sequence<Values - Place>());
        return 1 + countFieldsFrom<T, Values, Place + size>();
    } else {
        return 1 + countFieldsFrom<T, Values, Place + 1>();
    }
}

/// Which field of how many is the first array, for a message; a count of 0 when there are too many values to tell.
struct ArrayPlace {
    std::size_t index = 0;
    std::size_t count = 0;
};

template <class T>
consteval ArrayPlace placeOfArray() {
    constexpr std::size_t values = countFrom < T, sizeof(T) < 256 ? sizeof(T) : 256 > ();
    if constexpr (takes<T, AnyField>(std::make_index_sequence<values + 1>())) {
        return {};
    } else {
        return {firstArray<T, values>(std::make_index_sequence<values>()), countFieldsFrom<T, values, 0>()};
    }
}

}  // namespace detail

/// Whether `T` can be taken apart: an aggregate class without bases and arrays, of at most `maximumFields` fields.
template <class T>
concept Reflectable = detail::obstacle<std::remove_cv_t<T>>()
== detail::Obstacle::none;

/// The number of fields of a reflectable type.
template <class T>
inline constexpr std::size_t fieldCount = std::is_empty_v<T> ? 0 : detail::countFrom<T, detail::mostFields<T>>();

/// The names of the fields, in declaration order.
template <class T>
CORVANE_LOCAL inline constexpr std::array<std::string_view, fieldCount<T>> fieldNames =
    detail::collectNames<T, fieldCount<T>>(std::make_index_sequence<fieldCount<T>>());

namespace detail {
template <class T, class Visitor, std::size_t... I>
constexpr void visitFields(T& value, Visitor& visitor, std::index_sequence<I...>) {
    using Record = std::remove_cv_t<T>;
    auto fields = tieFields<sizeof...(I)>(value);
    static_cast<void>(fields);
    (visitor(fieldNames<Record>[I], std::get<I>(fields)), ...);
}
}  // namespace detail

/// Calls `visitor(name, field)` for each field in declaration order.
template <class T, class Visitor>
requires Reflectable<T>
constexpr void forEachField(T& value, Visitor&& visitor) {
    detail::visitFields(value, visitor, std::make_index_sequence<fieldCount<std::remove_cv_t<T>>>());
}

}  // namespace corvane::reflection

#pragma GCC visibility pop
