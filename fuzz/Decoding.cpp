// JSON into the types of a host, and back.

#include <corvane/Models/Decoding.h>
#include <corvane/Models/EventData.h>

#include "fuzz/FuzzTarget.h"

#include <chrono>
#include <map>
#include <set>
#include <vector>

namespace corvane::fuzz {

namespace decoding {

enum class Level : std::int8_t { low, high };
enum class Word { one, two };
std::string_view toText(Word word) {
    return word == Word::one ? "one" : "two";
}
bool fromText(std::string_view text, Word& word) {
    word = text == "one" ? Word::one : Word::two;
    return text == toText(word);
}

struct Numbers {
    std::optional<std::int8_t> a;
    std::optional<std::uint16_t> b;
    std::optional<std::int64_t> c;
    std::optional<std::uint64_t> d;
    std::optional<float> e;
    std::optional<double> f;
    std::optional<bool> g;
};
struct Times {
    std::optional<Date> a;
    std::optional<std::chrono::sys_time<std::chrono::days>> b;
    std::optional<std::chrono::nanoseconds> c;
    std::optional<std::chrono::duration<std::int16_t>> d;
    std::optional<std::chrono::duration<double>> e;
    std::optional<std::chrono::duration<float, std::nano>> f;
};
struct Everything {
    std::optional<Numbers> numbers;
    std::vector<Times> times;
    std::map<std::string, std::vector<std::optional<Level>>> levels;
    std::optional<std::set<Word>> words;
    std::optional<std::u8string> text;
    std::optional<std::vector<TimedData>> spans;
    std::optional<JSON> any;
};

}  // namespace decoding

template <class T>
void check(const JSON& json) {
    std::optional<T> value;
    try {
        value = decode<T>(json);
    } catch (const DecodingError& error) {
        CORVANE_REQUIRE(std::string_view(error.what()).size() > 5, "an error says nothing");
        return;
    }
    const JSON made = encoded(*value);
    const auto& text = made.text();
    CORVANE_REQUIRE(JSON(text).exists() && jsontext::isUTF8(text), "what was decoded encodes as no JSON");
    CORVANE_REQUIRE(encoded(decode<T>(made)).text() == text, "what was encoded decodes as something else");
    CORVANE_REQUIRE(encoded(decode<T>(JSON(text))).text() == text, "what was written reads as something else");
}

}  // namespace corvane::fuzz

using namespace corvane;
using namespace corvane::fuzz;
using namespace corvane::fuzz::decoding;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto text = fuzz::textOf(data, size);
    const JSON json(text);
    if (jsontext::nesting(json.text()) >= jsontext::maximumDepth) return 0;  // decodes, and is too deep to be encoded
    for (const JSON& one : {json, JSON::fromEncodedText(std::string(text))}) {
        check<Everything>(one);
        check<Numbers>(one);
        check<Times>(one);
        check<std::map<std::string, JSON>>(one);
        check<std::vector<std::optional<double>>>(one);
    }
    return 0;
}
