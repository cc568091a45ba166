#pragma once

#include <corvane/Catalogue/Vocabulary.h>

#include <string>
#include <string_view>
#include <vector>

// How the things of a catalogue are called in its files. Internal.

namespace corvane::catalogue {

inline constexpr std::string_view schemaSuffix = ".schema.json";
/// The schema of the document. No event's file has its name: what is not a letter, a digit or "_" is escaped there.
inline constexpr std::string_view documentSchemaFile = "user-events.schema.json";
inline constexpr std::string_view pageFile = "catalogue.md";
/// In each schema, so that one which is not needed any more is known as the library's own.
inline constexpr std::string_view writtenBy = "Written by corvane::writeCatalogue, which overwrites changes.";

/// A name with everything but letters, digits and "_" escaped: "ScreenView", "Box+3Cint+3E". No two become one.
[[nodiscard]] std::string plainName(std::string_view name);

/// The file of an event's schema: "ScreenView.schema.json".
[[nodiscard]] std::string schemaFileOf(std::string_view event);

/// A name for each definition, none twice: the type's, or its whole one with namespaces where others have that, or with
/// a number behind it where even that is not enough.
[[nodiscard]] std::vector<std::string> namesOf(const std::vector<Definition>& definitions);

}  // namespace corvane::catalogue
