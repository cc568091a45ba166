#pragma once

#include <corvane/Export.h>
#include <corvane/Models/JSON.h>
#include <corvane/Platform/Date.h>

#include <concepts>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

namespace corvane {

class BridgedDataEventType;
class BridgedDataType;
class BridgedError;

/// A value whose kind is known at run time only: what plug-ins and scripting languages describe their data with.
///
/// Immutable; copies share arrays, dictionaries and objects, and may be read from any thread. Any value can be held,
/// also one that JSON has no word for: `toJsonValue` and the calls that take data say what is wrong with it. Values may
/// nest as deep as memory allows, and are destroyed without recursion.
///
///     HostValue::Dictionary track{{"title", "Prelude"}, {"length", 184.5}, {"tags", HostValue::Array{"calm", 3}}};
class CORVANE_EXPORT HostValue {
  public:
    enum class Kind { null, boolean, integer, unsignedInteger, real, string, date, array, dictionary, object };

    struct Entry;
    class Dictionary;
    using Array = std::vector<HostValue>;

    HostValue() : HostValue(nullptr) {}
    HostValue(std::nullptr_t) : value_(nullptr) {}  // NOLINT(google-explicit-constructor): values read as literals
    template <std::same_as<bool> B>
    CORVANE_LOCAL HostValue(B value) : value_(value) {}  // NOLINT(google-explicit-constructor)
    /// An integer; one beyond the signed 64-bit range is of the kind `unsignedInteger`.
    template <std::integral I>
    requires(!std::same_as<I, bool>) CORVANE_LOCAL HostValue(I value) {  // NOLINT(google-explicit-constructor)
        if (std::in_range<std::int64_t>(value)) {
            value_ = static_cast<std::int64_t>(value);
        } else {
            value_ = static_cast<std::uint64_t>(value);
        }
    }
    HostValue(double value) : value_(value) {}                         // NOLINT(google-explicit-constructor)
    HostValue(std::string value) : value_(std::move(value)) {}         // NOLINT(google-explicit-constructor)
    HostValue(std::string_view value) : value_(std::string(value)) {}  // NOLINT(google-explicit-constructor)
    /// A string, which ends at the first zero; null for nullptr.
    HostValue(const char* value);             // NOLINT(google-explicit-constructor)
    HostValue(Date value) : value_(value) {}  // NOLINT(google-explicit-constructor)
    HostValue(Array elements);                // NOLINT(google-explicit-constructor)
    HostValue(Dictionary dictionary);         // NOLINT(google-explicit-constructor)
    /// An object of the host's; null for nullptr. Of a `T` that implements neither `BridgedDataEventType` nor
    /// `BridgedDataType` nothing is known, and no conversion takes it.
    template <class T>
    CORVANE_LOCAL HostValue(std::shared_ptr<T> object);  // NOLINT(google-explicit-constructor)

    [[nodiscard]] Kind kind() const { return static_cast<Kind>(value_.index()); }

    /// The value if it is of that kind, otherwise nothing. Pointers are good as long as this value.
    [[nodiscard]] std::optional<bool> bool_() const { return as<bool>(); }
    [[nodiscard]] std::optional<std::int64_t> integer() const { return as<std::int64_t>(); }
    [[nodiscard]] std::optional<std::uint64_t> unsignedInteger() const { return as<std::uint64_t>(); }
    [[nodiscard]] std::optional<double> double_() const { return as<double>(); }
    [[nodiscard]] std::optional<Date> date() const { return as<Date>(); }
    [[nodiscard]] const std::string* string() const { return std::get_if<std::string>(&value_); }
    [[nodiscard]] const Array* array() const;
    [[nodiscard]] const Dictionary* dictionary() const { return std::get_if<Dictionary>(&value_); }

    /// The object as a data event, or as a value that converts itself; nullptr when it is neither.
    [[nodiscard]] const BridgedDataEventType* dataEvent() const;
    [[nodiscard]] const BridgedDataType* data() const;

  private:
    struct Node;
    using NodeRef = std::shared_ptr<const Node>;
    static NodeRef makeNode(Array elements, std::vector<Entry> entries);

    struct Object {
        std::shared_ptr<const void> owner;
        const BridgedDataEventType* dataEvent = nullptr;
        const BridgedDataType* data = nullptr;
    };

  public:
    /// Entries in the order in which they were given. Of two entries with one key the later one counts. A value of one
    /// word whose copies share the entries.
    class CORVANE_EXPORT Dictionary {
      public:
        Dictionary() = default;
        Dictionary(std::initializer_list<Entry> entries);
        explicit Dictionary(std::vector<Entry> entries);

        [[nodiscard]] const std::vector<Entry>& entries() const;

      private:
        NodeRef node_;  // nullptr when empty
    };

  private:
    template <class T>
    [[nodiscard]] CORVANE_LOCAL std::optional<T> as() const {
        const T* value = std::get_if<T>(&value_);
        return value ? std::optional<T>(*value) : std::nullopt;
    }

    // In the order of Kind.
    std::variant<std::nullptr_t, bool, std::int64_t, std::uint64_t, double, std::string, Date, NodeRef, Dictionary,
                 Object>
        value_;
};

/// A key with its value. A key that is not a string fails the conversion of its dictionary.
struct HostValue::Entry {
    HostValue key;
    HostValue value;
};

template <class T>
HostValue::HostValue(std::shared_ptr<T> object) : value_(nullptr) {
    if (!object) return;
    Object held;
    if constexpr (std::convertible_to<T*, const BridgedDataEventType*>) held.dataEvent = object.get();
    if constexpr (std::convertible_to<T*, const BridgedDataType*>) held.data = object.get();
    held.owner = std::move(object);
    value_ = std::move(held);
}

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
/// Whether that is known to succeed without asking any object, so that it may as well be done later, on another thread.
[[nodiscard]] bool isPlain(const HostValue::Dictionary& dictionary);
}  // namespace detail

}  // namespace corvane
