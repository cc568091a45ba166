#pragma once

#include <corvane/Catalogue/Descriptions.h>
#include <corvane/Export.h>
#include <corvane/Reflection/DataType.h>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

// Declarations of events and data as plain values: what the templates of Describe.h gather and a catalogue is written
// from. Values; none of them is shared between threads by the library.

namespace corvane::catalogue {

/// What JSON a value becomes.
struct Shape {
    enum class Kind {
        anything,  ///< any JSON value
        object,    ///< any JSON object
        boolean,
        integer,  ///< between `minimum` and `maximum`
        real,
        text,
        date,      ///< whole milliseconds since 1970
        duration,  ///< whole milliseconds
        array,     ///< of `element`
        map,       ///< an object whose members are all `element`
        named,     ///< as the definition at `definition` says
    };
    Kind kind = Kind::anything;
    bool mayBeNull = false;
    std::int64_t minimum = 0;
    std::uint64_t maximum = 0;
    std::vector<Shape> element = {};         ///< one, of an array or a map
    std::optional<std::size_t> length = {};  ///< of an array that always has as many
    std::size_t definition = 0;              ///< an index into `Vocabulary::definitions`
};

/// One field of a data type, property of an event, or key of the session.
struct Member {
    std::string name;
    Shape shape;
    bool isRequired = true;
    std::string description = {};
};

/// A type of the host's that has a name: a record, an enumeration, or one that writes itself.
struct CORVANE_EXPORT Definition {
    enum class Form { record, enumeration, own };

    /// Lists one more value of an enumeration. Several enumerators may be written alike.
    void addValue(std::string jsonText);

    DataType type;
    bool isToDict = false;  ///< what its `toDict` gives, which the same type as a field is not asked for
    Form form = Form::record;
    std::string description = {};
    std::vector<Member> members = {};      ///< of a record
    Shape shape = {};                      ///< of an enumeration or own writer, where nothing below says more
    std::vector<std::string> values = {};  ///< of an enumeration, each as JSON text; empty when nobody lists them
    std::string schema = {};               ///< of an own writer, where the host states it
};

/// An event type.
struct Event {
    DataType type;
    std::string description = {};
    std::vector<Member> properties = {};
};

/// The events of a catalogue with the types that they use.
struct CORVANE_EXPORT Vocabulary {
    std::vector<Event> events;
    std::vector<Definition> definitions;
    std::vector<Member> session;  ///< what the host pushes into the session, by key

    /// The index of a type's definition, and whether it has just been made.
    std::pair<std::size_t, bool> define(const DataType& type, bool isToDict);
    /// Adds an event unless it is there. Throws `InvalidArgument` when another type has its name, by which the library
    /// would take the one for the other, and when the name is not UTF-8.
    void add(Event event);
    /// Adds a key of the session. Throws `InvalidArgument` when it is there, or is the library's own.
    void add(Member sessionData);
};

/// Gives members the descriptions that the host states. Throws `InvalidArgument` when one is of a name that no member
/// has: somebody renamed a field.
CORVANE_EXPORT void describe(const DataType& type, std::vector<Member>& members,
                             std::span<const FieldDescription> descriptions);

}  // namespace corvane::catalogue
