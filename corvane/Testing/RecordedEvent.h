#pragma once

#include <corvane/Models/Encoding.h>
#include <corvane/Models/ProcessEvent.h>

#include <iosfwd>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace corvane::test {

/// The value at a path inside a JSON value: keys and, for arrays, indices counted from 0, joined by dots, as in
/// "cart.items.0.title". Nothing (`exists()` is false) when there is none, and for the empty path. A key that has a
/// dot in it cannot be reached so; take `JSON`'s own operators for it. Any thread.
[[nodiscard]] JSON valueAt(const JSON& json, std::string_view path);

/// A value that a field is expected to have. Made, without a cast, from anything that a field of a host's own types can
/// hold: text, numbers, booleans, dates, records, ranges. A value, whose copies share their contents.
class FieldValue {
  public:
    FieldValue(const char* text) : FieldValue(std::string_view(text)) {}  // NOLINT(google-explicit-constructor)
    FieldValue(std::nullptr_t) : json_("null") {}                         // NOLINT(google-explicit-constructor)
    /// Throws `EncodingError` for what cannot be written: text that is not UTF-8, a number that is none.
    template <class T>
    CORVANE_LOCAL FieldValue(const T& value) : json_(encoded(value)) {}  // NOLINT(google-explicit-constructor)

    /// Whether a field has this value. Numbers are compared as numbers, 2 and 2.0 being one; everything else by its
    /// JSON text, in which the order of keys counts. A field that is not there has no value.
    [[nodiscard]] bool equals(const JSON& field) const;
    /// The value as JSON text.
    [[nodiscard]] const std::string& text() const { return json_.text(); }

  private:
    JSON json_;
};

/// A path and the value that is expected there: `{"screen.name", "home"}`.
struct ExpectedField {
    std::string path;
    FieldValue value;
};

/// An event as a `RecordingProcessor` has kept it. A value; any thread.
class RecordedEvent : public ProcessEvent {
  public:
    explicit RecordedEvent(ProcessEvent event) : ProcessEvent(std::move(event)) {}

    /// The value at a path, as for `valueAt`. Throws `std::out_of_range`, with the path and the whole event in the
    /// message, when there is none: a test that asks for it by mistake shall not go on with nothing.
    [[nodiscard]] JSON at(std::string_view path) const;
    /// Whether every one of the fields has its value.
    [[nodiscard]] bool has(const std::vector<ExpectedField>& fields) const;

    /// Name and JSON on one line, as in the messages of failed assertions: `ScreenView {"screen":{"name":"home"}}`.
    [[nodiscard]] std::string description() const;
    friend std::ostream& operator<<(std::ostream& out, const RecordedEvent& event);
};

}  // namespace corvane::test
