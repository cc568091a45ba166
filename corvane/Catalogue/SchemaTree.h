#pragma once

#include <corvane/Catalogue/Vocabulary.h>

#include <map>
#include <string>

// Internal.

namespace corvane::catalogue {

/// The schemas of a vocabulary: names of files with their text. Throws `InvalidArgument` when a schema that the host
/// states is none.
[[nodiscard]] std::map<std::string, std::string> schemaFiles(const Vocabulary& vocabulary);

}  // namespace corvane::catalogue
