#include <corvane/Processing/UserEvents.h>

#include <corvane/Models/Encoder.h>
#include <corvane/Models/OwnJSON.h>

#include <utility>

namespace corvane {

UserEvents::~UserEvents() = default;

JSON UserEvents::jsonObject() const {
    // Session and events were checked when they were encoded, so their texts are joined as they are.
    std::string text;
    std::size_t size = session_.text().size() + 160;
    for (const auto& part : events_) size += part->text().size() + 1;
    text.reserve(size);
    text += R"({"metadata":{"version":")";
    text += formatVersion;
    text += R"(","identifier":)";
    if (!jsontext::appendString(text, identifier_)) throw EncodingError(EncodingError::notUTF8, "metadata.identifier");
    text += R"(},"data":{"session":)";
    text += session_.text();
    text += R"(,"events":[)";
    const char* between = "";
    for (const auto& part : events_) {
        text.append(std::exchange(between, ",")).append(part->text());
    }
    text += "]}}";
    return OwnJSON::of(std::move(text));
}

}  // namespace corvane
