#include <corvane/Processing/UserEvents.h>

#include <corvane/Models/Encoder.h>
#include <corvane/Models/OwnJSON.h>

namespace corvane {

UserEvents::~UserEvents() = default;

JSON UserEvents::jsonObject() const {
    // Session and events were checked when they were encoded, so their texts are joined as they are.
    std::string text;
    text.reserve(events_->text().size() + session_.text().size() + 160);
    text += R"({"metadata":{"version":")";
    text += formatVersion;
    text += R"(","identifier":)";
    if (!jsontext::appendString(text, identifier_)) throw EncodingError(EncodingError::notUTF8, "metadata.identifier");
    text += R"(},"data":{"session":)";
    text += session_.text();
    text += R"(,"events":[)";
    text += events_->text();
    text += "]}}";
    return OwnJSON::of(std::move(text));
}

}  // namespace corvane
