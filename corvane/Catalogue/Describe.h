#pragma once

#include <corvane/Catalogue/Vocabulary.h>
#include <corvane/Models/Encoding.h>
#include <corvane/Models/EventData.h>
#include <corvane/Models/EventProperty.h>
#include <corvane/Models/EventSubmit.h>

#include <array>
#include <concepts>
#include <limits>
#include <ranges>
#include <string>
#include <tuple>
#include <type_traits>
#include <utility>

// Gathers declarations: the same choices, in the same order, that the encoders of Models/Encoding.h make, without a
// value. Internal.

#pragma GCC visibility push(hidden)  // what is made of host types belongs to the object that makes it

namespace corvane::catalogue {

template <>
inline constexpr auto description<EventData> = "What identifies an event.";
template <>
inline constexpr auto fieldDescriptions<EventData> =
    std::to_array<FieldDescription>({{"eventID", "A random UUID, upper case."},
                                     {"eventTimestamp", "When the application submitted the event."},
                                     {"eventPath", "The tracker's place, such as /root/player."},
                                     {"sessionID", "The session that the event belongs to."}});
template <>
inline constexpr auto description<TimedData> = "How long an event took.";
template <>
inline constexpr auto fieldDescriptions<TimedData> = std::to_array<FieldDescription>(
    {{"duration", "In milliseconds; negative when the end lies before the start, as when a clock was set."}});

}  // namespace corvane::catalogue

namespace corvane::catalogue::detail {

namespace models = corvane::detail;

template <class T>
Shape shapeOf(Vocabulary& vocabulary);

template <class T>
concept WritesDict = requires(const T& data) {
    { data.toDict() } -> std::same_as<JSON>;
};

template <class T>
inline constexpr bool isEventProperty = false;
template <class D>
inline constexpr bool isEventProperty<EventProperty<D>> = true;

template <class T>
struct DataOf;
template <class D>
struct DataOf<EventProperty<D>> {
    using Type = D;
};

template <std::integral T>
Shape integerShape() {
    return {.kind = Shape::Kind::integer,
            .minimum = static_cast<std::int64_t>(std::numeric_limits<T>::min()),
            .maximum = static_cast<std::uint64_t>(std::numeric_limits<T>::max())};
}

/// What a type writes by its own code.
template <class T>
Shape ownShape(Vocabulary& vocabulary, bool isToDict, Shape::Kind kind) {
    const auto [index, isNew] = vocabulary.define(DataType::of<T>(), isToDict);
    if (isNew) {
        Definition& definition = vocabulary.definitions[index];
        definition.form = Definition::Form::own;
        definition.description = description<T>;
        definition.shape.kind = kind;
        definition.schema = schema<T>;
    } else if (kind == Shape::Kind::anything) {
        vocabulary.definitions[index].shape.kind = kind;  // what is an object as data may be anything as a field
    }
    return {.kind = Shape::Kind::named, .definition = index};
}

template <class E>
Shape enumerationShape(Vocabulary& vocabulary) {
    const auto [index, isNew] = vocabulary.define(DataType::of<E>(), false);
    if (isNew) {
        Definition& definition = vocabulary.definitions[index];
        definition.form = Definition::Form::enumeration;
        definition.description = description<E>;
        if constexpr (models::TextEnumeration<E>) {
            definition.shape.kind = Shape::Kind::text;
        } else {
            definition.shape = shapeOf<std::underlying_type_t<E>>(vocabulary);
        }
        for (const E value : enumerators<E>) definition.addValue(encoded(value).text());
    }
    return {.kind = Shape::Kind::named, .definition = index};
}

/// The type and the name of a record's field.
template <class T, std::size_t I>
consteval auto fieldAt() {
    if constexpr (Described<T>) {
        return std::type_identity<std::remove_cvref_t<decltype(std::declval<const T&>().*
                                                               std::get<I>(FieldsOf<T>::corvaneFields()).member)>>();
    } else {
        using Fields = decltype(reflection::tieFields<reflection::fieldCount<T>>(std::declval<T&>()));
        return std::type_identity<std::remove_cvref_t<std::tuple_element_t<I, Fields>>>();
    }
}
template <class T, std::size_t I>
std::string_view fieldNameAt() {
    if constexpr (Described<T>) {
        return std::get<I>(FieldsOf<T>::corvaneFields()).name;
    } else {
        return reflection::fieldNames<T>[I];
    }
}

/// A field is left out when any of its optionals is without a value.
template <class T>
Member memberOf(Vocabulary& vocabulary, std::string_view name) {
    if constexpr (models::isOptional<T>) {
        Member member = memberOf<std::remove_cv_t<typename T::value_type>>(vocabulary, name);
        member.isRequired = false;
        return member;
    } else {
        return {.name = std::string(name), .shape = shapeOf<T>(vocabulary)};
    }
}

template <class T, std::size_t... I>
std::vector<Member> membersOf(Vocabulary& vocabulary, std::index_sequence<I...>) {
    std::vector<Member> members;
    (members.push_back(memberOf<typename decltype(fieldAt<T, I>())::type>(vocabulary, fieldNameAt<T, I>())), ...);
    return members;
}

template <class T>
Shape recordShape(Vocabulary& vocabulary) {
    const auto [index, isNew] = vocabulary.define(DataType::of<T>(), false);
    if (isNew) {
        auto members = membersOf<T>(vocabulary, std::make_index_sequence<models::countFields<T>()>());
        describe(DataType::of<T>(), members, fieldDescriptions<T>);
        Definition& definition = vocabulary.definitions[index];  // they may have moved meanwhile
        definition.description = description<T>;
        definition.members = std::move(members);
    }
    return {.kind = Shape::Kind::named, .definition = index};
}

template <class T>
Shape arrayShape(Vocabulary& vocabulary) {
    Shape shape{.kind = Shape::Kind::array,
                .element = {shapeOf<std::remove_cv_t<std::ranges::range_value_t<T>>>(vocabulary)}};
    if constexpr (requires { std::tuple_size<T>::value; }) shape.length = std::tuple_size_v<T>;
    return shape;
}

/// What a value of type `T` becomes.
template <class T>
Shape shapeOf(Vocabulary& vocabulary) {
    if constexpr (models::EncodesItself<T>) {
        return ownShape<T>(vocabulary, false, Shape::Kind::anything);
    } else if constexpr (std::same_as<T, JSON>) {
        return {};
    } else if constexpr (std::same_as<T, bool>) {
        return {.kind = Shape::Kind::boolean};
    } else if constexpr (std::is_enum_v<T>) {
        return enumerationShape<T>(vocabulary);
    } else if constexpr (std::integral<T>) {
        return integerShape<T>();
    } else if constexpr (std::floating_point<T>) {
        return {.kind = Shape::Kind::real};
    } else if constexpr (models::TextArray<T> || models::Text<T>) {
        return {.kind = Shape::Kind::text, .mayBeNull = std::is_pointer_v<T>};
    } else if constexpr (models::isSystemTime<T>) {
        return {.kind = Shape::Kind::date};
    } else if constexpr (models::isDuration<T>) {
        return {.kind = Shape::Kind::duration};
    } else if constexpr (models::isOptional<T>) {
        Shape shape = shapeOf<std::remove_cv_t<typename T::value_type>>(vocabulary);
        shape.mayBeNull = true;
        return shape;
    } else if constexpr (models::StringMap<T>) {
        return {.kind = Shape::Kind::map, .element = {shapeOf<std::remove_cv_t<typename T::mapped_type>>(vocabulary)}};
    } else if constexpr (std::ranges::range<const T>) {
        return arrayShape<T>(vocabulary);
    } else {
        return recordShape<T>(vocabulary);
    }
}

/// What a data event becomes: always an object, or the event is not recorded. A type that is no data event is filled
/// only by data that was pushed by name.
template <class D>
Shape dataShapeOf(Vocabulary& vocabulary) {
    if constexpr (!DataEventType<D>) {
        return {.kind = Shape::Kind::object};
    } else if constexpr (WritesDict<D>) {
        return ownShape<D>(vocabulary, true, Shape::Kind::object);
    } else if constexpr (models::EncodesItself<D>) {
        return ownShape<D>(vocabulary, false, Shape::Kind::object);
    } else {
        return shapeOf<D>(vocabulary);
    }
}

template <class E>
void addEvent(Vocabulary& vocabulary) {
    if constexpr (models::check(models::searchEvent<E>())) {
        Event event{.type = DataType::of<E>(), .description = std::string(description<E>)};
        const auto addProperty = [&]<class T>(std::string_view name, const T& field) {
            if constexpr (isEventProperty<T>) {
                event.properties.push_back({.name = std::string(name),
                                            .shape = dataShapeOf<typename DataOf<T>::Type>(vocabulary),
                                            .isRequired = !field.isOptional()});
            } else if constexpr (std::derived_from<T, EventPropertyType>) {
                event.properties.push_back({.name = std::string(name),
                                            .shape = {.kind = Shape::Kind::object},
                                            .isRequired = !field.isOptional()});
            }
        };
        const E declarations{};
        forEachField(declarations, addProperty);
        describe(event.type, event.properties, fieldDescriptions<E>);
        vocabulary.add(std::move(event));
    }
}

template <class D>
void addSessionData(Vocabulary& vocabulary, const std::string& key) {
    if constexpr (models::check(models::searchDataEvent<models::Use::later, D>())) {
        Shape shape = dataShapeOf<D>(vocabulary);
        vocabulary.add(Member{.name = key, .shape = std::move(shape), .isRequired = false});
    }
}

}  // namespace corvane::catalogue::detail

#pragma GCC visibility pop
