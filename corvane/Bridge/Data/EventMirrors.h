#pragma once

// Internal: making and checking the property lists of bridged events. Never included by a public header.

#include <corvane/Bridge/Data/BridgedEventClass.h>
#include <corvane/Bridge/Models/Refusal.h>
#include <corvane/Models/EventMirrorStore.h>

#include <memory>
#include <set>
#include <string>
#include <vector>

namespace corvane::bridge {

/// Collects the properties of one event, refusing what would break its JSON.
class EventMirrors {
  public:
    /// Throws `BridgeError` for names that are not UTF-8, an unknown requirement, and a name that was added before.
    void add(const std::string& name, const std::string& dataName, BridgedEventPropertyRequirement requirement,
             std::shared_ptr<const EventPropertyType> property) {
        requireUTF8(name, "a property's name");
        requireUTF8(dataName, "the name of a property's data");
        if (requirement != BridgedEventPropertyRequirement::required &&
            requirement != BridgedEventPropertyRequirement::optional) {
            throw BridgeError(BridgeError::unknownValue, "the requirement of property " + name);
        }
        if (!names_.insert(name).second) throw BridgeError(BridgeError::repeatedProperty, "property " + name);
        mirrors_.push_back({name, std::move(property)});
    }

    [[nodiscard]] EventMirrorProperties take() {
        return std::make_shared<const std::vector<EventMirrorProperty>>(std::move(mirrors_));
    }

  private:
    std::set<std::string> names_;
    std::vector<EventMirrorProperty> mirrors_;
};

}  // namespace corvane::bridge
