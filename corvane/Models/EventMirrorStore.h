#pragma once

#include <corvane/Export.h>
#include <corvane/Models/EventPropertyType.h>
#include <corvane/Platform/StringMap.h>

#include <memory>
#include <set>
#include <shared_mutex>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace corvane {

/// A declared property: its name and its declaration.
struct EventMirrorProperty {
    std::string name;
    std::shared_ptr<const EventPropertyType> eventProperty;
};

/// The properties of an event type in declaration order.
using EventMirrorProperties = std::shared_ptr<const std::vector<EventMirrorProperty>>;

/// Keeps the declarations of event types, read once per event name. One store is shared by a chain of trackers; it
/// grows by one list per distinct name and may be used from any thread.
class CORVANE_EXPORT EventMirrorStore {
  public:
    /// The properties under `eventName`, made by `mirror` the first time. Of two types with one name, the first one
    /// looked up defines it.
    EventMirrorProperties properties(std::string_view eventName, std::vector<EventMirrorProperty> (*mirror)());

    /// Notes that data of another type than the declared one was found under its name, and says whether that is news.
    [[nodiscard]] bool isNews(DataType declared, DataType found);

  private:
    std::shared_mutex mutex_;
    std::set<std::pair<std::string, std::string>> otherTypes_;
    StringMap<EventMirrorProperties> cache_;
};

}  // namespace corvane
