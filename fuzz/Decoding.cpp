// JSON into the types of a host, and back.

#include <corvane/Models/Decoding.h>
#include <corvane/Models/EventData.h>

#include "fuzz/FuzzTarget.h"

#include <map>
#include <set>

namespace corvane::fuzz {

enum class Level : std::int8_t { low, high };
enum class Word { one, two };
static std::string_view toText(Word word) {
    return word == Word::one ? "one" : "two";
}
static bool fromText(std::string_view text, Word& word) {
    word = text == "one" ? Word::one : Word::two;
    return text == toText(word);
}

struct Numbers {
    std::optional<std::int8_t> a;
    std::optional<std::uint64_t> b;
    std::optional<float> c;
    std::optional<double> d;
    std::optional<bool> e;
};
struct Times {
    std::optional<Date> a;
    std::optional<std::chrono::sys_time<std::chrono::days>> b;
    std::optional<std::chrono::nanoseconds> c;
    std::optional<std::chrono::duration<std::int16_t>> d;
    std::optional<std::chrono::minutes> e;
};
struct Everything {
    std::optional<Numbers> numbers;
    std::vector<Times> times;
    std::map<std::string, std::vector<std::optional<Level>>> levels;
    std::optional<std::set<Word>> words;
    std::optional<std::u8string> text;
    std::optional<TimedData> span;
    std::optional<JSON> any;
};

template <class T>
static void check(const JSON& json) {
    std::optional<T> value;
    try {
        value = decode<T>(json);
    } catch (const DecodingError& error) {
        CORVANE_REQUIRE(*error.what(), "an error says nothing");
        return;
    }
    const JSON made = encoded(*value);
    const auto& text = made.text();
    CORVANE_REQUIRE(encoded(decode<T>(made)).text() == text, "what was encoded decodes as something else");
    CORVANE_REQUIRE(encoded(decode<T>(JSON(text))).text() == text, "what was written reads as something else");
}

}  // namespace corvane::fuzz

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    using namespace corvane;
    const auto text = fuzz::textOf(data, size);
    for (const JSON& json : {JSON(text), JSON::fromEncodedText(std::string(text))}) {
        // What is deeper decodes, but cannot be encoded.
        if (!json.exists() || jsontext::nesting(json.text()) >= jsontext::maximumDepth) return 0;
        fuzz::check<fuzz::Everything>(json);
        fuzz::check<std::map<std::string, JSON>>(json);
        fuzz::check<std::vector<std::optional<double>>>(json);
    }
    return 0;
}
