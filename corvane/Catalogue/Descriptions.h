#pragma once

#include <array>
#include <string_view>

// What a catalogue of events cannot see in a declaration, and a host may state beside it, by specialising one of these
// for a type of its own. Costs the host nothing at run time and includes next to nothing, so it may stand in the header
// that declares the types.
//
//     template <> inline constexpr auto corvane::catalogue::description<Screen> = "What a person looks at.";
//     template <> inline constexpr auto corvane::catalogue::fieldDescriptions<Screen> =
//         std::to_array<corvane::catalogue::FieldDescription>({{"depth", "How many screens lie beneath it."}});
//     template <> inline constexpr auto corvane::catalogue::enumerators<Quality> =
//         std::array{Quality::standard, Quality::high};
//     template <> inline constexpr auto corvane::catalogue::schema<Position> =
//         R"({"type": "object", "required": ["lat", "lon"]})";

#pragma GCC visibility push(hidden)  // what is made of host types belongs to the object that makes it

namespace corvane::catalogue {

/// What one field of a data type, or one property of an event, means.
struct FieldDescription {
    std::string_view field;
    std::string_view text;
};

/// What a data type, an event type or an enumeration means: plain text, of one paragraph. Empty when nobody says.
template <class T>
inline constexpr std::string_view description{};

/// The descriptions of some fields of a data type, or properties of an event type. A name that is no field of the type
/// is an error of the catalogue.
template <class T>
inline constexpr std::array<FieldDescription, 0> fieldDescriptions{};

/// All values that an enumeration ever has. A type does not tell them, and one of flags has more than it names: without
/// this an enumeration is any integer of its width, or any text.
template <class E>
inline constexpr std::array<E, 0> enumerators{};

/// The JSON Schema of what a type writes by its own `encode` or `toDict`, as text: an object or a boolean. Without this
/// such a type may have written anything.
template <class T>
inline constexpr std::string_view schema{};

}  // namespace corvane::catalogue

#pragma GCC visibility pop
