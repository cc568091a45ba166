#pragma once

#include <corvane/Models/EventSubmit.h>
#include <corvane/Platform/SharedMutex.h>
#include <corvane/Platform/StringMap.h>

#include <memory>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace corvane {

/// Keeps the declarations of event types, read once per event name. One store is shared by a chain of trackers; it
/// grows by one list per distinct name and may be used from any thread. Internal.
class EventMirrorStore {
  public:
    /// The properties under `eventName`, made by `mirror` the first time. Of two types with one name, the first one
    /// looked up defines it.
    EventMirrorProperties properties(std::string_view eventName, std::vector<EventMirrorProperty> (*mirror)());

    /// Notes that data of another type than the declared one was found under its name, and says whether that is news.
    [[nodiscard]] bool isNews(DataType declared, DataType found);

  private:
    SharedMutex mutex_;
    std::set<std::pair<std::string, std::string>> otherTypes_ CORVANE_GUARDED_BY(mutex_);
    StringMap<EventMirrorProperties> cache_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane
