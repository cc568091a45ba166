// JSON text, its tree and its typed views.

#include <corvane/Models/JSON.h>
#include <corvane/Models/JSONShape.h>
#include <corvane/Processing/EncodedEvents.h>

#include "fuzz/FuzzTarget.h"

using namespace corvane;

// Every part is what its typed views say.
static void checkViews(const JSON& json) {
    CORVANE_REQUIRE(json.exists() && json.any(), "a part of a value does not exist");
    if (const auto elements = json.array()) {
        for (const auto& element : *elements) checkViews(element);
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
        CORVANE_REQUIRE(json.double_() && (*integer >= 0) == json.unsignedInteger().has_value(),
                        "it is another number");
    } else {
        CORVANE_REQUIRE(json.isNull() || json.bool_() || json.double_(), "a value is of no kind");
    }
}

static void checkText(const JSON& json) {
    const std::string& text = json.text();
    CORVANE_REQUIRE(jsontext::isUTF8(text) && JSON(text).text() == text, "the text does not come back");
    CORVANE_REQUIRE(JSON::fromEncodedText(text).description() == json.description(), "the tree is another one");
    try {
        const std::string sorted = json.toData({.sortedKeys = true});
        CORVANE_REQUIRE(JSON(json.toData({.prettyPrinted = true})).text() == text, "laid out it is another value");
        CORVANE_REQUIRE(JSON(sorted).toData({.sortedKeys = true}) == sorted, "sorted it is another value");
    } catch (const JSONError&) {
        CORVANE_REQUIRE(!json.array() && !json.object(), "an array or object cannot be written");
    }
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto text = fuzz::textOf(data, size);
    const JSON json(text);
    CORVANE_REQUIRE(json.exists() == JSON::fromEncodedText(std::string(text)).exists(), "two readers disagree");
    CORVANE_REQUIRE(json.exists() != json.text().empty(), "a value has no text");
    if (json.exists()) {
        checkViews(json);
        checkText(json);
    }
    if (const auto count = jsonshape::objectsBetween(text, EncodedEvents::opening, EncodedEvents::closing)) {
        CORVANE_REQUIRE(json["events"].array().value().size() == *count, "there is another number of events");
    }
    return 0;
}
