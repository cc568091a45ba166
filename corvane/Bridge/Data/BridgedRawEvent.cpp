#include <corvane/Bridge/Data/BridgedRawEvent.h>

#include <corvane/Bridge/Data/BridgedRawEventMirrorProperty.h>
#include <corvane/Bridge/Data/EventMirrors.h>

#include <optional>

namespace corvane {

/// Made and checked once, so that a submission finds everything ready.
struct BridgedRawEvent::Declaration : EventDeclaration {
    Declaration(std::string eventName, Properties list)
        : EventDeclaration{{}, &mirrorsOf}, ownName(std::move(eventName)), properties(std::move(list)) {
        name = ownName;
        try {
            bridge::requireUTF8(ownName, "the event's name");
            bridge::EventMirrors collected;
            for (const auto& [propertyName, property] : properties) {
                collected.add(propertyName, property.dataName(), property.requirement(),
                              std::make_shared<const BridgedRawEventMirrorProperty>(property));
            }
            mirrors = collected.take();
        } catch (const BridgeError& error) {
            refusal = error;
        }
    }

    static EventMirrorProperties mirrorsOf(const EventDeclaration& self, EventMirrorStore&) {
        const auto& declaration = static_cast<const Declaration&>(self);
        if (declaration.refusal) throw BridgeError(*declaration.refusal);
        return declaration.mirrors;
    }

    const std::string ownName;
    const Properties properties;
    EventMirrorProperties mirrors;
    std::optional<BridgeError> refusal;
};

BridgedRawEvent::BridgedRawEvent(std::string name, Properties properties)
    : declaration_(std::make_shared<const Declaration>(std::move(name), std::move(properties))) {}

const std::string& BridgedRawEvent::name() const {
    return declaration_->ownName;
}
const BridgedRawEvent::Properties& BridgedRawEvent::properties() const {
    return declaration_->properties;
}
EventSubmit BridgedRawEvent::eventSubmit() const {
    return EventSubmit(declaration_);
}
void BridgedRawEvent::check() const {
    if (declaration_->refusal) throw BridgeError(*declaration_->refusal);
}

}  // namespace corvane
