#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Error.h>

#include <concepts>
#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

namespace corvane {

struct OwnJSON;

/// How JSON text is laid out. The default is compact, keys in the order in which they were written.
struct JSONWritingOptions {
    bool prettyPrinted = false;  ///< one member a line, indented by two blanks
    bool sortedKeys = false;     ///< the keys of every object in ascending byte order
};

/// A JSON value is not what an operation needs. Domain "Corvane.JSONError".
class CORVANE_EXPORT JSONError : public Error {
  public:
    enum Code {
        invalidTopLevelValue = 0,  ///< neither an object nor, where that is allowed, an array
    };
    explicit JSONError(Code code);
    JSONError(const JSONError&) = default;
    JSONError& operator=(const JSONError&) = default;
    ~JSONError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
    /// The enumeration value of an integer code, or nothing.
    [[nodiscard]] static std::optional<Code> fromCode(int code) noexcept;
};

/// One JSON value, or nothing, with typed views that never fail.
///
/// A JSON holds text or a tree and makes the other on demand, once. It is immutable and shares its contents when it is
/// copied; it may be read from any thread.
///
///     JSON json(R"({"id": 7, "tags": ["a"]})");
///     json["id"].integer();       // 7
///     json["tags"][0].string();   // "a"
///     json["nothing"].exists();   // false
class CORVANE_EXPORT JSON {
  public:
    using Array = std::vector<JSON>;
    using Object = std::map<std::string, JSON, std::less<>>;
    using Number = std::variant<std::int64_t, double, bool>;
    using Value = std::variant<std::nullptr_t, bool, std::int64_t, double, std::string, Array, Object>;

    /// Parses UTF-8 text; a bare string, number, boolean or null is allowed at the top. Never fails: text that is not
    /// JSON, nests deeper than 512, or has a number beyond the range of a double gives a value that is nothing. The
    /// numbers of parsed text are of one kind: an integral one such as 3.0 answers `integer`, and every one answers
    /// `double_`.
    explicit JSON(std::string_view bytes);

    /// Takes compact JSON text as the library's own encoders write it. Its numbers keep their exact kinds. Nothing
    /// looks at it until it is asked for a view, or becomes part of an event, a session or a document: text that turns
    /// out to be no JSON is a value that is nothing then, and is refused there.
    [[nodiscard]] static JSON fromEncodedText(std::string text);

    /// The member `key` of an object; otherwise nothing.
    [[nodiscard]] JSON operator[](std::string_view key) const;
    /// The element at `index` of an array; otherwise nothing.
    template <std::integral I>
    [[nodiscard]] CORVANE_LOCAL JSON operator[](I index) const {
        return element(static_cast<std::int64_t>(index));
    }

    /// Whether there is a value. A JSON null is one.
    [[nodiscard]] bool exists() const;
    [[nodiscard]] bool isNull() const;
    [[nodiscard]] bool isObject() const;

    /// The value itself, or nothing.
    [[nodiscard]] std::optional<Value> any() const;
    [[nodiscard]] std::optional<std::string> string() const;
    [[nodiscard]] std::optional<std::int64_t> integer() const;
    /// Integers of 0 and above, up to the largest that 64 bits hold.
    [[nodiscard]] std::optional<std::uint64_t> unsignedInteger() const;
    [[nodiscard]] std::optional<double> double_() const;
    [[nodiscard]] std::optional<bool> bool_() const;
    [[nodiscard]] std::optional<Array> array() const;
    [[nodiscard]] std::optional<Object> object() const;
    /// The number as the first of integer, double and boolean that fits, or nothing.
    [[nodiscard]] std::optional<Number> number() const;

    /// Serialises an object or an array. Throws `JSONError` for anything else.
    [[nodiscard]] std::string toData(JSONWritingOptions options = {}) const;

    /// This value if it is an object. Throws `JSONError` otherwise.
    [[nodiscard]] JSON payload() const;

    /// The value as compact JSON text, whatever its kind; empty when there is no value. The reference is good as long
    /// as a copy of this object.
    [[nodiscard]] const std::string& text() const;

    /// The value as a person reads it in a log: objects as `["key": value, ...]`, `[:]` when empty, strings in quotes.
    [[nodiscard]] std::string description() const;

  private:
    friend struct OwnJSON;
    struct Storage;
    explicit JSON(std::shared_ptr<const Storage> storage);

    [[nodiscard]] JSON element(std::int64_t index) const;

    std::shared_ptr<const Storage> storage_;
};

}  // namespace corvane
