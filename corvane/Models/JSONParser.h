#pragma once

// Internal: never included by a public header.

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace corvane {

/// What is told of a JSON text as it is read, in the text's order. Texts come in parts of any length, the last of them
/// by `key` or `string`; they last for the call only.
class JSONListener {
  public:
    virtual void beginObject() {}
    virtual void endObject(std::size_t members) = 0;
    virtual void beginArray() {}
    virtual void endArray(std::size_t elements) = 0;
    virtual void keyPart(std::string_view) {}
    virtual void key(std::string_view lastPart) = 0;
    virtual void stringPart(std::string_view) {}
    virtual void string(std::string_view lastPart) = 0;
    virtual void integer(std::int64_t) = 0;
    virtual void unsignedInteger(std::uint64_t) = 0;  // one beyond the range of the signed
    virtual void number(double) = 0;
    virtual void boolean(bool) = 0;
    virtual void null() = 0;

  protected:
    ~JSONListener() = default;
};

/// Reads UTF-8 JSON text to a listener. False when it is not one JSON value, nests deeper than `maximumDepth`, or has a
/// number beyond a double's range; the listener may have heard the start of it. Integers stay integers, and a
/// floating-point number is the nearest double.
[[nodiscard]] bool parseJSON(std::string_view text, int maximumDepth, JSONListener& listener);

}  // namespace corvane
