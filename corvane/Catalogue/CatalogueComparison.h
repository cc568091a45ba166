#pragma once

#include <corvane/Export.h>

#include <filesystem>
#include <string>
#include <vector>

namespace corvane {

/// One difference between two catalogues.
///
/// A change breaks a reader when events of the new catalogue may hold what the old one ruled out, or lack what it
/// promised: a field is gone or optional now, is of another type or unit, has a wider range, may be null, or has a
/// value that its enumeration did not have (a reader that knows all values falls through). What narrows does not break
/// one: a field or event that is new, required now, of a smaller range, without a value that it could have had. A
/// change that is not understood, as within a schema that the host states, counts as breaking.
struct CatalogueChange {
    std::string event;  ///< its name; "user-events" for the document and the session
    std::string path;   ///< within the event: "screen.name", "viewer.interests[]", "counts.*"; empty for the event
    std::string what;   ///< for people: "is optional now"
    bool isBreaking = false;
};

/// What has changed from one catalogue, as `writeCatalogue` wrote it, to another, in the order of the events' names.
/// Names of data types are not on the wire, and no change. Throws `SystemError` when a directory or file cannot be
/// read, as when there is no catalogue, and `InvalidArgument` when a schema is no JSON.
[[nodiscard]] CORVANE_EXPORT std::vector<CatalogueChange> compareCatalogues(const std::filesystem::path& before,
                                                                            const std::filesystem::path& after);

}  // namespace corvane
