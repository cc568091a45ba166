#include <corvane/Catalogue/Vocabulary.h>

#include <corvane/Platform/Error.h>
#include <corvane/Platform/JSONText.h>

#include <algorithm>

namespace corvane::catalogue {

void Definition::addValue(std::string jsonText) {
    if (std::ranges::find(values, jsonText) == values.end()) values.push_back(std::move(jsonText));
}

std::pair<std::size_t, bool> Vocabulary::define(const DataType& type, bool isToDict) {
    const auto found = std::ranges::find_if(definitions, [&](const Definition& definition) {
        return definition.type == type && definition.isToDict == isToDict;
    });
    const auto index = static_cast<std::size_t>(found - definitions.begin());
    if (found != definitions.end()) return {index, false};
    definitions.push_back({.type = type, .isToDict = isToDict});
    return {index, true};
}

void Vocabulary::add(Event event) {
    if (!jsontext::isUTF8(event.type.name())) {
        throw InvalidArgument("the name of the event type " + event.type.qualifiedName() + " is not UTF-8");
    }
    for (const Event& other : events) {
        if (other.type == event.type) return;
        if (other.type.name() != event.type.name()) continue;
        throw InvalidArgument("two event types are called " + std::string(event.type.name()) + ", and would be taken " +
                              "for each other: " + other.type.qualifiedName() + " and " + event.type.qualifiedName());
    }
    events.push_back(std::move(event));
}

void Vocabulary::add(Member sessionData) {
    const bool isTaken = std::ranges::any_of(session, [&](const Member& m) { return m.name == sessionData.name; });
    if (isTaken || sessionData.name == "sessionID" || !jsontext::isUTF8(sessionData.name)) {
        throw InvalidArgument("session data cannot have the key \"" + sessionData.name +
                              "\": it is taken, or not UTF-8");
    }
    session.push_back(std::move(sessionData));
}

void describe(const DataType& type, std::vector<Member>& members, std::span<const FieldDescription> descriptions) {
    for (const auto& [field, text] : descriptions) {
        const auto member = std::ranges::find(members, field, &Member::name);
        if (member == members.end()) {
            throw InvalidArgument("there is a description of the field " + std::string(field) + ", which " +
                                  type.qualifiedName() + " does not have");
        }
        member->description = text;
    }
}

}  // namespace corvane::catalogue
