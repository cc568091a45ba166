#pragma once

#include <corvane/Export.h>
#include <corvane/Models/JSON.h>
#include <corvane/Platform/Date.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/JSONText.h>

#include <array>
#include <bitset>
#include <cstdint>
#include <string>
#include <string_view>

namespace corvane {

/// A value that JSON cannot hold. The message names the property: "viewer.name: the text is not UTF-8". Domain
/// "Corvane.EncodingError".
class CORVANE_EXPORT EncodingError : public Error {
  public:
    enum Code {
        notUTF8 = 0,  ///< text that is not UTF-8
        notFinite,    ///< a floating-point number that is infinite or not a number
        tooDeep,      ///< objects and arrays nested deeper than `jsontext::maximumDepth`
        malformed,    ///< calls on an encoder, or a text taken as encoded, that are not one JSON value
        outOfRange,   ///< a date whose milliseconds do not fit 64 bits
    };
    EncodingError(Code code, std::string path);
    EncodingError(const EncodingError&) = default;
    EncodingError& operator=(const EncodingError&) = default;
    ~EncodingError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
    /// Which value: "viewer.name"; empty for the value itself.
    [[nodiscard]] const std::string& path() const noexcept { return path_; }
    /// The same error as seen from the object that holds the value under `name`.
    [[nodiscard]] EncodingError within(std::string_view name) const;

  private:
    std::string path_;
};

/// Writes one JSON value as compact text. What the generated encoders write through, and what a type that encodes
/// itself (`void encode(corvane::Encoder&) const`) is given. Not thread-safe; make one, use it, take the text.
///
/// Every operation throws `EncodingError` on a value that JSON cannot hold and on a call out of place, after which
/// the encoder is of no further use.
class CORVANE_EXPORT Encoder {
  public:
    Encoder();
    Encoder(const Encoder&) = delete;
    Encoder& operator=(const Encoder&) = delete;

    void beginObject() { begin('{', true); }
    void endObject() { end('}', true); }
    void beginArray() { begin('[', false); }
    void endArray() { end(']', false); }

    /// The key of the next value.
    void key(std::string_view name);

    void string(std::string_view text);
    void integer(std::int64_t number);
    void unsignedInteger(std::uint64_t number);
    void real(double number);
    void real(float number);
    void boolean(bool value);
    void null();
    /// Whole milliseconds since 1970.
    void date(Date date);
    /// A date as milliseconds since 1970, for clocks that reach further than `Date`; truncated toward zero.
    void date(long double milliseconds);
    /// A JSON value, whose text goes in as it is; null when it holds nothing. Text that was taken as encoded is looked
    /// at here: one that is no JSON would break everything it ends up in.
    void json(const JSON& value);

    /// The finished text. Throws `malformed` unless exactly one value has been written.
    [[nodiscard]] std::string take() &&;
    /// The same as a JSON value.
    [[nodiscard]] JSON takeJSON() &&;

  private:
    void begin(char bracket, bool isObject);
    void end(char bracket, bool isObject);
    void beforeValue();
    [[nodiscard]] std::string keyAt(int level) const;
    [[noreturn]] void fail(EncodingError::Code code) const;

    std::string out_;
    int depth_ = 0;
    bool needsComma_ = false;
    bool hasKey_ = false;
    std::bitset<jsontext::maximumDepth + 1> isObject_;
    std::array<std::size_t, jsontext::maximumDepth + 1> keys_;  // where each level's key is in the text; 0 for none
};

}  // namespace corvane
