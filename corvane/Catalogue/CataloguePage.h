#pragma once

#include <corvane/Catalogue/Vocabulary.h>

#include <string>

// Internal.

namespace corvane::catalogue {

/// The vocabulary as a page in Markdown.
[[nodiscard]] std::string page(const Vocabulary& vocabulary);

}  // namespace corvane::catalogue
