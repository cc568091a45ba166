#include <corvane/Models/EventMirrorStore.h>

namespace corvane {

EventMirrorProperties EventMirrorStore::properties(std::string_view eventName,
                                                   std::vector<EventMirrorProperty> (*mirror)()) {
    {
        const ReadLock lock(mutex_);
        if (const auto found = cache_.find(eventName); found != cache_.end()) return found->second;
    }
    auto properties = std::make_shared<const std::vector<EventMirrorProperty>>(mirror());
    const WriteLock lock(mutex_);
    return cache_.try_emplace(std::string(eventName), std::move(properties)).first->second;
}

EventMirrorProperties detail::storedProperties(EventMirrorStore& store, std::string_view eventName,
                                               std::vector<EventMirrorProperty> (*mirror)()) {
    return store.properties(eventName, mirror);
}

void detail::addProperty(std::vector<EventMirrorProperty>& properties, std::string_view name,
                         std::unique_ptr<const EventPropertyType> property) {
    properties.push_back({std::string(name), std::move(property)});
}

bool EventMirrorStore::isNews(DataType declared, DataType found) {
    const WriteLock lock(mutex_);
    return otherTypes_.emplace(declared.qualifiedName(), found.qualifiedName()).second;
}

}  // namespace corvane
