// JSON text, its tree and its typed views.

#include <corvane/Models/JSON.h>
#include <corvane/Models/JSONShape.h>
#include <corvane/Processing/EncodedEvents.h>

#include "fuzz/FuzzTarget.h"

namespace {

using namespace corvane;

// Every part is what its typed views say.
void checkViews(const JSON& json) {
    CORVANE_REQUIRE(json.exists() && json.any(), "a part of a value does not exist");
    if (const auto elements = json.array()) {
        for (std::size_t i = 0; i < elements->size(); ++i) {
            CORVANE_REQUIRE(json[i].exists(), "an element cannot be found");
            checkViews((*elements)[i]);
        }
        CORVANE_REQUIRE(!json[elements->size()].exists(), "there is an element behind the last");
    } else if (const auto members = json.object()) {
        for (const auto& [key, member] : *members) {
            CORVANE_REQUIRE(json[key].exists(), "a member cannot be found");
            checkViews(member);
        }
    } else if (const auto text = json.string()) {
        std::string encoded;
        CORVANE_REQUIRE(jsontext::appendString(encoded, *text) && encoded == json.text(), "a string is another one");
    } else if (const auto integer = json.integer()) {
        CORVANE_REQUIRE(json.double_() && json.number(), "an integer is no number");
        CORVANE_REQUIRE((*integer >= 0) == json.unsignedInteger().has_value(), "an integer has another sign");
    } else {
        CORVANE_REQUIRE(json.isNull() || json.bool_() || json.double_(), "a value is of no kind");
    }
}

void checkEncoded(const JSON& json) {
    const std::string& text = json.text();
    CORVANE_REQUIRE(jsontext::isUTF8(text), "the text is not UTF-8");
    const JSON again(text), encoded = JSON::fromEncodedText(text);
    CORVANE_REQUIRE(again.text() == text, "the text does not come back");
    CORVANE_REQUIRE(encoded.exists() && encoded.description() == json.description(), "the tree is another one");
    if (json.isObject() != json.object().has_value()) fail("an object is none");
    try {
        const std::string sorted = json.toData({.sortedKeys = true});
        const std::string pretty = json.toData({.prettyPrinted = true});
        CORVANE_REQUIRE(JSON(pretty).text() == text, "what is laid out is another value");
        CORVANE_REQUIRE(JSON(sorted).toData({.sortedKeys = true}) == sorted, "what is sorted is another value");
    } catch (const JSONError&) {
        CORVANE_REQUIRE(!json.array() && !json.object(), "an array or object cannot be written");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto text = fuzz::textOf(data, size);
    const JSON json(text);
    CORVANE_REQUIRE(json.exists() == JSON::fromEncodedText(std::string(text)).exists(), "two readers disagree");
    CORVANE_REQUIRE(json.exists() != json.text().empty(), "a value has no text");
    CORVANE_REQUIRE(!json.exists() || jsontext::isUTF8(text), "text that is not UTF-8 was read");
    if (json.exists()) {
        checkViews(json);
        checkEncoded(json);
    }
    const auto counted = jsonshape::objectsBetween(text, EncodedEvents::opening, EncodedEvents::closing);
    if (counted) {
        const auto events = json["events"].array();
        CORVANE_REQUIRE(events && events->size() == *counted, "there is another number of events");
    }
    return 0;
}
