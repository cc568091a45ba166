#include <corvane/Models/ProcessEvent.h>

#include <corvane/Models/Encoder.h>
#include <corvane/Models/OwnJSON.h>
#include <corvane/Platform/JSONText.h>

#include <utility>

namespace corvane {

ProcessEvent::ProcessEvent(std::string name, JSON json, std::optional<std::string> groupName)
    : name_(std::move(name)), json_(std::move(json)), groupName_(std::move(groupName)) {}

JSON ProcessEvent::payload() const {
    const JSON object = json_.payload();
    // A document nests a few levels deeper, and must be readable when it comes back from disk.
    if (!OwnJSON::is(object) && jsontext::nesting(object.text()) > jsontext::maximumDepth) {
        throw EncodingError(EncodingError::tooDeep, {});
    }
    const std::string& data = object.text();
    std::string text;
    text.reserve(data.size() + name_.size() + 64);
    text += R"({"data":)";
    text += data;
    text += R"(,"metadata":{"name":)";
    if (!jsontext::appendString(text, name_)) throw EncodingError(EncodingError::notUTF8, "metadata.name");
    text += R"(,"version":")";
    text += version();
    text += R"("}})";
    return OwnJSON::of(std::move(text));
}

}  // namespace corvane
