#include <corvane/Models/EventMirrorStore.h>

#include <mutex>

namespace corvane {

EventMirrorProperties EventMirrorStore::properties(std::string_view eventName,
                                                   std::vector<EventMirrorProperty> (*mirror)()) {
    {
        std::shared_lock lock(mutex_);
        if (const auto found = cache_.find(eventName); found != cache_.end()) return found->second;
    }
    auto properties = std::make_shared<const std::vector<EventMirrorProperty>>(mirror());
    std::unique_lock lock(mutex_);
    return cache_.try_emplace(std::string(eventName), std::move(properties)).first->second;
}

bool EventMirrorStore::isNews(DataType declared, DataType found) {
    std::unique_lock lock(mutex_);
    return otherTypes_.emplace(declared.qualifiedName(), found.qualifiedName()).second;
}

}  // namespace corvane
