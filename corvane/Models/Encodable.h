#pragma once

#include <corvane/Models/Fields.h>
#include <corvane/Models/ValueKinds.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <string_view>
#include <tuple>
#include <type_traits>
#include <utility>

// Which host types can be encoded, found out by the compiler where a host hands one over. A declaration that cannot be
// written, or would be written wrongly, stops there, with one sentence and the name of the field. Internal.

#pragma GCC visibility push(hidden)  // what is made of host types belongs to the object that makes it

namespace corvane::detail {

/// What is wrong with a declaration. The names are part of the compiler's message.
enum class Fault {
    none,
    unknownType,
    noDataEvent,
    noEvent,
    view,
    pointer,
    reference,
    bitField,
    unionMember,
    base,
    array,
    tooManyFields,
    wideText,
    character,
    wideInteger,
    repeatedKeys,
    keysAreNoText,
    rangeOfItself,
    spelledTwice,
    encodeIsNotConst,
    toDictIsNotJSON,
    toTextIsNoText,
    toTextElsewhere,
};

/// What a value is for: encoded while its owner waits, kept and encoded later, or a declaration in an event type.
enum class Use { now, later, declaration };

/// The name of a field as a template argument, so that the compiler says it.
template <std::size_t Size>
struct FieldName {
    char text[Size] = {};
};
template <std::size_t Size>
consteval FieldName<Size + 1> fieldName(std::string_view name) {
    FieldName<Size + 1> result;
    std::copy_n(name.data(), Size, result.text);
    return result;
}
/// Of a type that is no field.
inline constexpr FieldName<1> noName{};

/// What was found, in which type, at which of its fields.
template <Fault f, class Record, FieldName field>
struct Finding {
    static constexpr Fault fault = f;
};
using NoFinding = Finding<Fault::none, void, noName>;

template <Use use, class Holder, FieldName field, class T, class... Outer>
consteval auto searchValue();

/// What a field of an event type declares; a field of any other kind is ignored.
template <class T>
struct Declaration {
    static consteval auto search() { return NoFinding(); }
};

template <Use use, class Holder, FieldName field, class T, class... Outer>
consteval auto searchMember() {
    if constexpr (use == Use::declaration) {
        return Declaration<T>::search();
    } else {
        return searchValue<use, Holder, field, T, Outer...>();
    }
}

/// The first finding of several.
template <class First, class... Rest>
consteval auto firstOf(First first, Rest... rest) {
    if constexpr (First::fault != Fault::none || sizeof...(Rest) == 0) {
        return first;
    } else {
        return firstOf(rest...);
    }
}

template <class T>
consteval bool spellsTwice(std::size_t index) {
    return std::apply(
        [index](const auto&... field) {
            const std::array<std::string_view, sizeof...(field)> names{field.name...};
            return std::find(names.begin(), names.begin() + index, names[index]) != names.begin() + index;
        },
        FieldsOf<T>::corvaneFields());
}

template <class T>
concept DescribedInConstant = requires {
    typename std::bool_constant<(static_cast<void>(FieldsOf<T>::corvaneFields()), true)>;
};

template <Use use, class T, std::size_t I, class... Outer>
consteval auto searchDescribed() {
    using Member =
        std::remove_cvref_t<decltype(std::declval<const T&>().*std::get<I>(FieldsOf<T>::corvaneFields()).member)>;
    if constexpr (DescribedInConstant<T>) {
        constexpr std::string_view name = std::get<I>(FieldsOf<T>::corvaneFields()).name;
        constexpr auto field = fieldName<name.size()>(name);
        if constexpr (spellsTwice<T>(I)) {
            return Finding<Fault::spelledTwice, T, field>();
        } else {
            return searchMember<use, T, field, Member, Outer...>();
        }
    } else {
        return searchMember<use, T, noName, Member, Outer...>();
    }
}

template <class T, std::size_t N, std::size_t I>
consteval auto reflectedName() {
    constexpr std::string_view name = reflection::detail::fieldName<T, N, I>();
    return fieldName<name.size()>(name);
}

template <Use use, class T, std::size_t I, class... Outer>
consteval auto searchReflected() {
    constexpr std::size_t count = reflection::fieldCount<T>;
    if constexpr (!reflection::detail::haveAddresses<T, count>) {
        return Finding < std::is_copy_assignable_v<T> ? Fault::bitField : Fault::reference, T, noName > ();
    } else {
        using Fields = decltype(reflection::tieFields<count>(std::declval<T&>()));
        using Member = std::remove_cvref_t<std::tuple_element_t<I, Fields>>;
        return searchMember<use, T, reflectedName<T, count, I>(), Member, Outer...>();
    }
}

template <Use use, class T, class... Outer, std::size_t... I>
consteval auto searchFields(std::index_sequence<I...>) {
    if constexpr (sizeof...(I) == 0 || (std::same_as<T, Outer> || ...)) {
        return NoFinding();  // a type within itself is being searched already
    } else if constexpr (Described<T>) {
        return firstOf(searchDescribed<use, T, I, T, Outer...>()...);
    } else {
        return firstOf(searchReflected<use, T, I, T, Outer...>()...);
    }
}

template <class T>
consteval std::size_t countFields() {
    if constexpr (Described<T>) {
        return std::tuple_size_v<decltype(FieldsOf<T>::corvaneFields())>;
    } else {
        return reflection::fieldCount<T>;
    }
}

/// Why a type is no record, of a field of that type or, for what it is made of, of the type itself.
template <class Holder, FieldName field, class T>
consteval auto searchObstacle() {
    using reflection::detail::Obstacle;
    constexpr Obstacle obstacle = reflection::detail::obstacle<T>();
    if constexpr (obstacle == Obstacle::base) {
        return Finding<Fault::base, T, noName>();
    } else if constexpr (obstacle == Obstacle::tooManyFields) {
        return Finding<Fault::tooManyFields, T, noName>();
    } else if constexpr (obstacle == Obstacle::anonymousUnion) {
        return Finding<Fault::unionMember, T, noName>();
    } else if constexpr (obstacle == Obstacle::reference) {
        return Finding<Fault::reference, T, noName>();
    } else if constexpr (obstacle == Obstacle::array) {
        constexpr auto place = reflection::detail::placeOfArray<T>();
        if constexpr (place.count == 0) {
            return Finding<Fault::array, T, noName>();
        } else {
            return Finding<Fault::array, T, reflectedName<T, place.count, place.index>()>();
        }
    } else {
        return Finding<Fault::unknownType, Holder, field>();
    }
}

template <class Enum, class Holder>
consteval Fault faultOfEnumeration() {
    if constexpr (TextEnumeration<Enum>) {
        return Fault::none;
    } else if constexpr (requires(Enum value) { toText(value); }) {
        return Fault::toTextIsNoText;
    } else {
        return TextEnumerationAbroad<Enum, Holder> ? Fault::toTextElsewhere : Fault::none;
    }
}

/// The fault of a value that holds no others.
template <Use use, class Holder, class T>
consteval Fault faultOfSingle() {
    if constexpr (std::is_enum_v<T>) {
        return faultOfEnumeration<T, Holder>();
    } else if constexpr (Character<T>) {
        return Fault::character;
    } else if constexpr (std::integral<T>) {
        return sizeof(T) > sizeof(std::uint64_t) ? Fault::wideInteger : Fault::none;
    } else if constexpr (Text<T>) {
        return use == Use::later && View<T> ? Fault::view : Fault::none;
    } else if constexpr (WideText<T>) {
        return Fault::wideText;
    } else if constexpr (std::is_pointer_v<T>) {
        return Fault::pointer;
    } else if constexpr (std::is_union_v<T>) {
        return Fault::unionMember;
    } else if constexpr (use == Use::later && View<T>) {
        return Fault::view;
    } else if constexpr (!EncodesItself<T> && requires(T & value, Encoder & encoder) { value.encode(encoder); }) {
        return Fault::encodeIsNotConst;
    } else {
        return Fault::none;
    }
}

template <class T>
inline constexpr bool isSingle =
    EncodesItself<T> || std::same_as<T, JSON> || std::is_enum_v<T> || std::is_arithmetic_v<T> || std::integral<T> ||
    TextArray<T> || Text<T> || isSystemTime<T> || isDuration<T>;

/// The first fault in a value of type `T`, which is the field of that name of `Holder`, inside the records `Outer`.
template <Use use, class Holder, FieldName field, class T, class... Outer>
consteval auto searchValue() {
    if constexpr (constexpr Fault fault = TextArray<T> ? Fault::none : faultOfSingle<use, Holder, T>();
                  fault != Fault::none) {
        return Finding<fault, Holder, field>();
    } else if constexpr (isSingle<T>) {
        return NoFinding();
    } else if constexpr (isOptional<T>) {
        return searchValue<use, Holder, field, std::remove_cv_t<typename T::value_type>, Outer...>();
    } else if constexpr (Map<T> && !StringMap<T>) {
        return Finding<Fault::keysAreNoText, Holder, field>();
    } else if constexpr (Map<T> && RepeatsKeys<T>) {
        return Finding<Fault::repeatedKeys, Holder, field>();
    } else if constexpr (StringMap<T>) {
        return firstOf(searchValue<use, Holder, field, typename T::key_type, Outer...>(),
                       searchValue<use, Holder, field, typename T::mapped_type, Outer...>());
    } else if constexpr (std::ranges::range<const T>) {
        using Element = std::remove_cv_t<std::ranges::range_value_t<T>>;
        if constexpr (std::same_as<Element, T>) {
            return Finding<Fault::rangeOfItself, Holder, field>();
        } else {
            return searchValue<use, Holder, field, Element, Outer...>();
        }
    } else if constexpr (Record<T>) {
        return searchFields<use, T, Outer...>(std::make_index_sequence<countFields<T>()>());
    } else {
        return searchObstacle<Holder, field, T>();
    }
}

/// What a data event of the library's that wraps another one is judged by.
template <class T>
struct Contents {
    using Type = T;
};

/// The first fault in a data event.
template <Use use, class T>
consteval auto searchDataEvent() {
    if constexpr (!std::same_as<typename Contents<T>::Type, T>) {
        return searchDataEvent<use, typename Contents<T>::Type>();
    } else if constexpr (requires(const T& data) {
                             { data.toDict() } -> std::same_as<JSON>;
                         }) {
        return NoFinding();
    } else if constexpr (requires(T & data) { data.toDict(); }) {
        return Finding<Fault::toDictIsNotJSON, T, noName>();
    } else {
        constexpr auto finding = searchValue<use, T, noName, T>();
        if constexpr (finding.fault == Fault::none && !EncodesItself<T> && !Record<T>) {
            return Finding<Fault::noDataEvent, T, noName>();
        } else {
            return finding;
        }
    }
}

/// The first fault in an event type, in the data that it declares included.
template <class E>
consteval auto searchEvent() {
    if constexpr (std::is_class_v<E> && std::default_initializable<E> && Record<E>) {
        return searchFields<Use::declaration, E>(std::make_index_sequence<countFields<E>()>());
    } else {
        constexpr auto obstacle = searchObstacle<E, noName, E>();
        if constexpr (Record<E> || obstacle.fault == Fault::unknownType) {
            return Finding<Fault::noEvent, E, noName>();
        } else {
            return obstacle;
        }
    }
}

/// Stops the compiler with a sentence on what was found.
template <Fault fault, class Record, FieldName field>
consteval bool check(Finding<fault, Record, field>) {
    static_assert(fault != Fault::view,
                  "corvane: this field is a view or a pointer, and would be read after what it refers to is gone: hold "
                  "a std::string, a std::vector or another type that owns its contents");
    static_assert(fault != Fault::pointer,
                  "corvane: this field is a pointer: hold the value, or a std::optional of it");
    static_assert(fault != Fault::reference,
                  "corvane: this type has a reference, which cannot be kept: hold the value");
    static_assert(fault != Fault::bitField,
                  "corvane: this type has a bit-field, which has no address: make it a field of its own, or give the "
                  "type void encode(corvane::Encoder&) const");
    static_assert(fault != Fault::unionMember,
                  "corvane: this is a union, and nobody knows which member counts: hold the members apart, or give the "
                  "type void encode(corvane::Encoder&) const");
    static_assert(fault != Fault::base,
                  "corvane: this type has a base class, which hides the names of its fields: spell them in "
                  "corvaneFields(), or hold the base as a field");
    static_assert(fault != Fault::array,
                  "corvane: this field is an array, which hides the names of the others: hold a std::string or a "
                  "std::array, or spell the fields in corvaneFields()");
    static_assert(fault != Fault::tooManyFields,
                  "corvane: this type has more than 64 fields: spell them in corvaneFields()");
    static_assert(fault != Fault::wideText,
                  "corvane: this field is text of wide characters: hold UTF-8 in a std::string or a std::u8string");
    static_assert(fault != Fault::character,
                  "corvane: this field is made of single characters: say whether they are text (hold a std::string) or "
                  "numbers (hold a std::int8_t or a std::uint8_t)");
    static_assert(fault != Fault::wideInteger, "corvane: this field is an integer of more than 64 bits");
    static_assert(fault != Fault::repeatedKeys,
                  "corvane: this field is a map that can hold a key twice, which a JSON object cannot: hold a map of "
                  "vectors");
    static_assert(fault != Fault::keysAreNoText,
                  "corvane: this field is a map whose keys are not text, as those of a JSON object are");
    static_assert(fault != Fault::rangeOfItself,
                  "corvane: this field is a range of its own kind, as a std::filesystem::path is: hold its .string()");
    static_assert(fault != Fault::spelledTwice, "corvane: corvaneFields() spells this field twice");
    static_assert(fault != Fault::encodeIsNotConst,
                  "corvane: encode(corvane::Encoder&) must be const, or it is not called");
    static_assert(fault != Fault::toDictIsNotJSON,
                  "corvane: toDict() must be const and return a corvane::JSON, or it is not called");
    static_assert(fault != Fault::toTextIsNoText,
                  "corvane: the toText of this enumeration must return what converts to a std::string_view");
    static_assert(fault != Fault::toTextElsewhere,
                  "corvane: the toText of this enumeration stands in another namespace than the enumeration, where it "
                  "is not found: put it beside the enumeration");
    static_assert(fault != Fault::noDataEvent,
                  "corvane: only a data event can be recorded: a plain aggregate, a record that spells its fields in "
                  "corvaneFields(), or a type with void encode(corvane::Encoder&) const");
    static_assert(
        fault != Fault::noEvent,
        "corvane: this is no event type: a plain aggregate, or a record that spells its fields in "
        "corvaneFields(), that can be made without arguments and whose fields are EventProperty declarations");
    static_assert(
        fault != Fault::unknownType,
        "corvane: this type cannot be encoded: it is neither a value that JSON knows nor a plain aggregate of "
        "such fields; spell its fields in corvaneFields(), or give it void encode(corvane::Encoder&) const");
    return fault == Fault::none;
}

}  // namespace corvane::detail

#pragma GCC visibility pop
