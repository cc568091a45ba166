#pragma once

#include <corvane/Bridge/Data/BridgedEventClass.h>
#include <corvane/Models/EventMirrorStore.h>
#include <corvane/Models/EventSubmit.h>
#include <corvane/Platform/StringMap.h>

#include <memory>

namespace corvane {

/// Keeps the properties of event classes, asked for once per event name. One store belongs to one bridged tracker and
/// the handles on it, and is used on that tracker's queue; it grows by one list per distinct name.
class BridgedEventMirrorStore {
  public:
    BridgedEventMirrorStore();
    BridgedEventMirrorStore(const BridgedEventMirrorStore&) = delete;
    BridgedEventMirrorStore& operator=(const BridgedEventMirrorStore&) = delete;
    ~BridgedEventMirrorStore();

    /// The properties under the class's name, made from an instance the first time. Throws what the host's code throws,
    /// and `BridgeError` for a declaration that cannot be used; neither is kept. On the tracker's queue.
    [[nodiscard]] EventMirrorProperties properties(const BridgedEventClass& eventClass);

    /// A class as trackers take it, with its properties from `store`. Any thread.
    [[nodiscard]] static EventSubmit eventSubmit(const std::shared_ptr<BridgedEventMirrorStore>& store,
                                                 const BridgedEventClass& eventClass);

  private:
    StringMap<EventMirrorProperties> cache_;
};

}  // namespace corvane
