#pragma once

#include <corvane/Models/JSON.h>

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace collector {

/// What a document has that its schema does not allow.
struct Mismatch {
    std::string path;  ///< "data.events[3].data.screen.depth"
    std::string reason;
};

/// A JSON Schema, read: as much of the language as catalogues of events are written in.
struct Schema {
    bool allowsNothing = false;                        ///< the schema is `false`
    const Schema* reference = nullptr;                 ///< belongs to the folder
    std::vector<std::string> types;                    ///< any of them; empty for all
    std::optional<std::vector<corvane::JSON>> values;  ///< of "enum" or "const"
    std::optional<corvane::JSON> minimum, maximum;
    std::optional<std::size_t> minItems, maxItems;
    std::map<std::string, Schema, std::less<>> properties;
    std::vector<std::string> required;
    std::unique_ptr<Schema> additionalProperties, items;
    std::vector<Schema> anyOf, allOf;
    std::unique_ptr<Schema> condition, consequence, alternative;  ///< "if", "then" and "else"
};

/// Adds what of `value`, which stands at `path`, the schema does not allow.
void validate(const Schema& schema, const corvane::JSON& value, const std::string& path,
              std::vector<Mismatch>& mismatches);

}  // namespace collector
