#pragma once

#include <corvane/Catalogue/Describe.h>
#include <corvane/Catalogue/Vocabulary.h>
#include <corvane/Export.h>

#include <filesystem>
#include <initializer_list>
#include <map>
#include <string>
#include <utility>

// A catalogue of events, written from their declarations: JSON Schemas for programs that read the documents, and a page
// for people. Meant for a test of the host's own, which keeps the files beside its sources and fails when they change:
//
//     EXPECT_FALSE((corvane::writeCatalogue<ScreenView, Play>("docs/events"))) << "look at the changes and commit
//     them";
//
// Not part of <corvane/corvane.h>: only what writes a catalogue includes this.

namespace corvane {

namespace catalogue {

/// A key of the session with the type of its data, as in `SessionData{"device", device}`. Made by `sessionData`.
struct SessionKey {
    std::string key;
    void (*add)(Vocabulary& vocabulary, const std::string& key);
};

/// Says that the host pushes data of type `D` into the session under this key.
template <class D>
[[nodiscard]] CORVANE_LOCAL SessionKey sessionData(std::string key) {
    return {std::move(key), &detail::addSessionData<D>};
}

/// The declarations of the event types with those of the data that they carry. Throws `InvalidArgument` when two
/// different event types have one name, when a name is not UTF-8, when a description is of a field that does not exist,
/// and when a session's key is given twice.
template <class... Events>
[[nodiscard]] CORVANE_LOCAL Vocabulary vocabularyOf(std::initializer_list<SessionKey> session = {}) {
    Vocabulary vocabulary;
    (detail::addEvent<Events>(vocabulary), ...);
    for (const SessionKey& data : session) data.add(vocabulary, data.key);
    return vocabulary;
}

/// The files of a catalogue, names with contents; the same for the same declarations, byte for byte. Throws
/// `InvalidArgument` when the schema that the host states for a type is neither a JSON object nor a boolean.
[[nodiscard]] CORVANE_EXPORT std::map<std::string, std::string> files(const Vocabulary& vocabulary);

/// Writes the files of a catalogue; see `writeCatalogue`.
CORVANE_EXPORT bool write(const Vocabulary& vocabulary, const std::filesystem::path& directory);

}  // namespace catalogue

/// Writes the catalogue of these event types, and returns whether that changed anything in the directory.
///
/// - `<Event>.schema.json` for each event: the JSON Schema (2020-12) of its "data". In the names of files everything
///   but letters, digits and "_" is escaped.
/// - `user-events.schema.json`: the schema of a whole document. It refers to the others by their names.
/// - `catalogue.md`: the same for people.
///
/// The directory is made if it is missing; its other files are left alone, but schemas that an earlier call wrote and
/// this one did not are removed. Each file is replaced whole or not at all, one that would not change is not touched,
/// and a file may be read by those who may read the directory. What a vocabulary consists of is known to one call: a
/// second call with other events and the same directory takes the place of the first.
///
/// @param session what the host pushes into the session: `{catalogue::sessionData<Device>("device")}`
///
/// Throws `InvalidArgument`, before anything is written, as `catalogue::vocabularyOf` and `catalogue::files` do, and
/// `SystemError` when a file or the directory cannot be read or written. Waits for the disk; from any thread.
template <class... Events>
CORVANE_LOCAL bool writeCatalogue(const std::filesystem::path& directory,
                                  std::initializer_list<catalogue::SessionKey> session = {}) {
    return catalogue::write(catalogue::vocabularyOf<Events...>(session), directory);
}

}  // namespace corvane
