#pragma once

#include <corvane/Bridge/Models/HostValue.h>
#include <corvane/Export.h>
#include <corvane/Models/JSON.h>

#include <optional>
#include <string>

namespace corvane {

class BridgedError;

/// A run-time value as JSON: null, strings, numbers and booleans as they are, a date as whole milliseconds since 1970
/// truncated toward zero, arrays and dictionaries element by element, an object by its own conversion. Inside arrays
/// and dictionaries a data event is its dictionary.
///
/// A pure function: any thread. Throws, with nothing half converted, `DataEventError::dataNotSerializable`,
/// `dataArrayValueNotSerializable` or `dataDictValueNotSerializable` for an object that cannot be converted where it
/// stands; `dataDictKeyNotSerializable` for a dictionary with a key that is not a string, before any of its values is
/// looked at; `EncodingError` for text that is not UTF-8, a number that is not finite, and what nests deeper than
/// `jsontext::maximumDepth`; and what an object's own conversion throws or reports.
[[nodiscard]] CORVANE_EXPORT JSON toJsonValue(const HostValue& value);

/// The same for object-facing callers: a failure returns nothing and fills `error`, unless that is nullptr.
[[nodiscard]] CORVANE_EXPORT std::optional<JSON> toJsonValueAndReturnError(const HostValue& value, BridgedError* error);

/// `JSON::toData` for object-facing callers: a failure returns nothing and fills `error`, unless that is nullptr.
[[nodiscard]] CORVANE_EXPORT std::optional<std::string> toDataWithOptions(const JSON& json, JSONWritingOptions options,
                                                                          BridgedError* error);

namespace detail {
/// The dictionary of an object-facing data event. As `toJsonValue`, but its values are what JSON knows or objects that
/// convert themselves: a data event among them throws `DataEventError::dataNotSerializable`.
[[nodiscard]] JSON toJsonObject(const HostValue::Dictionary& dictionary);
}  // namespace detail

}  // namespace corvane
