#include <corvane/Bridge/Data/BridgedEventMirrorStore.h>

#include <corvane/Bridge/Data/BridgedEventMirrorProperty.h>
#include <corvane/Bridge/Data/EventMirrors.h>

#include <utility>

namespace corvane {

namespace {

struct ClassDeclaration : EventDeclaration {
    ClassDeclaration(std::shared_ptr<BridgedEventMirrorStore> mirrorStore, const BridgedEventClass& bridgedClass)
        : EventDeclaration{{}, &propertiesOf}, store(std::move(mirrorStore)), eventClass(bridgedClass) {
        name = eventClass.eventName();
    }

    static EventMirrorProperties propertiesOf(const EventDeclaration& self, EventMirrorStore&) {
        const auto& declaration = static_cast<const ClassDeclaration&>(self);
        return declaration.store->properties(declaration.eventClass);
    }

    const std::shared_ptr<BridgedEventMirrorStore> store;
    const BridgedEventClass eventClass;
};

}  // namespace

BridgedEventMirrorStore::BridgedEventMirrorStore() = default;
BridgedEventMirrorStore::~BridgedEventMirrorStore() = default;

EventMirrorProperties BridgedEventMirrorStore::properties(const BridgedEventClass& eventClass) {
    if (const auto found = cache_.find(eventClass.eventName()); found != cache_.end()) return found->second;
    bridge::EventMirrors mirrors;
    for (const auto& property : eventClass.eventProperties()) {
        mirrors.add(property.name(), property.dataKey(), property.requirement(),
                    std::make_shared<const BridgedEventMirrorProperty>(property));
    }
    return cache_.try_emplace(eventClass.eventName(), mirrors.take()).first->second;
}

EventSubmit BridgedEventMirrorStore::eventSubmit(const std::shared_ptr<BridgedEventMirrorStore>& store,
                                                 const BridgedEventClass& eventClass) {
    return EventSubmit(std::make_shared<const ClassDeclaration>(store, eventClass));
}

}  // namespace corvane
