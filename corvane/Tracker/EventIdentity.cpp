#include <corvane/Tracker/EventIdentity.h>

#include <corvane/Models/Encoder.h>
#include <corvane/Platform/JSONText.h>
#include <corvane/Platform/UUID.h>

namespace corvane {

EventIdentity::EventIdentity(std::string_view eventPath, std::string_view sessionID) : sessionID_(sessionID) {
    std::string rest = R"(,"eventPath":)";
    if (!jsontext::appendString(rest, eventPath)) return;
    rest += R"(,"sessionID":)";
    if (!jsontext::appendString(rest, sessionID)) return;
    rest_ = rest + '}';
}

void EventIdentity::append(std::string& out, Date submitTime) const {
    if (rest_.empty()) throw EncodingError(EncodingError::notUTF8, "eventPath");
    out += R"({"eventID":")";
    appendUUID(out);
    out += R"(","eventTimestamp":)";
    jsontext::appendInteger(out, millisecondsSince1970(submitTime));
    out += rest_;
}

}  // namespace corvane
