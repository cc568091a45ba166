#pragma once

#include <cstddef>
#include <string>
#include <vector>

namespace collector {

/// A user-events document as far as a collector needs to look into it.
struct Document {
    std::string identifier;
    std::size_t events = 0;             ///< how many it holds
    std::vector<std::string> eventIDs;  ///< of those that have one
    std::string line;                   ///< the whole document, without line breaks
};

/// Checks the shape of a document and takes out what identifies it and its events. Throws `Refusal` (400), whose
/// reason says what is wrong where.
[[nodiscard]] Document readDocument(std::string text);

}  // namespace collector
