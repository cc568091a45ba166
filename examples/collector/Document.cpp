#include "Document.h"

#include "Refusal.h"

#include <corvane/Models/JSON.h>

#include <algorithm>
#include <optional>
#include <string_view>
#include <utility>

namespace collector {

namespace {

using corvane::JSON;

void require(bool holds, const std::string& what) {
    if (!holds) throw Refusal(400, "the document is not as expected: " + what);
}

// A UUID in its usual 36 characters.
bool isUUID(const std::optional<std::string>& text) {
    constexpr std::string_view shape = "xxxxxxxx-xxxx-xxxx-xxxx-xxxxxxxxxxxx";
    constexpr std::string_view digits = "0123456789ABCDEFabcdef";
    return text && std::ranges::equal(*text, shape, [&](char c, char expected) {
               return expected == '-' ? c == '-' : digits.find(c) != std::string_view::npos;
           });
}

// The identity of an event is a property of whatever name.
std::optional<std::string> eventIDOf(const JSON::Object& properties) {
    for (const auto& [name, property] : properties) {
        if (auto identifier = property["eventID"].string()) return identifier;
    }
    return std::nullopt;
}

void readEvent(const JSON& event, const std::string& place, Document& document) {
    require(event["metadata"].isObject(), place + ".metadata is not an object");
    require(event["metadata"]["name"].string().has_value(), place + ".metadata.name is not a string");
    require(event["metadata"]["version"].string().has_value(), place + ".metadata.version is not a string");
    const auto properties = event["data"].object();
    require(properties.has_value(), place + ".data is not an object");
    if (auto identifier = eventIDOf(*properties)) document.eventIDs.push_back(std::move(*identifier));
}

}  // namespace

Document readDocument(std::string text) {
    const JSON json(text);
    if (!json.exists()) throw Refusal(400, "the decompressed body is not JSON");
    require(json["metadata"].isObject(), "metadata is not an object");
    require(json["metadata"]["version"].string() == "0.1.0", "metadata.version is not \"0.1.0\"");
    auto identifier = json["metadata"]["identifier"].string();
    require(isUUID(identifier), "metadata.identifier is not a UUID");
    require(json["data"]["session"].isObject(), "data.session is not an object");
    require(json["data"]["session"]["sessionID"].string().has_value(), "data.session.sessionID is not a string");
    const auto events = json["data"]["events"].array();
    require(events.has_value(), "data.events is not an array");

    Document document{.identifier = std::move(*identifier), .events = events->size(), .eventIDs = {}, .line = {}};
    for (std::size_t i = 0; i < events->size(); ++i) {
        readEvent((*events)[i], "data.events[" + std::to_string(i) + "]", document);
    }
    // Inside the strings of JSON a line break is escaped, so one that stands here only parts tokens.
    std::ranges::replace(text, '\n', ' ');
    std::ranges::replace(text, '\r', ' ');
    document.line = std::move(text);
    return document;
}

}  // namespace collector
