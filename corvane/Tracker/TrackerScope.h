#pragma once

#include <corvane/Models/TrackerTimer.h>
#include <corvane/Platform/StringMap.h>
#include <corvane/Tracker/DataEventStacks.h>
#include <corvane/Tracker/EventIdentity.h>
#include <corvane/Tracker/Tracker.h>

#include <memory>
#include <vector>

namespace corvane {

/// What a tracker holds for its events. Internal.
struct Tracker::Scope {
    TrackerTimers timers;
    StringMap<EventSubmit> restartTimers;
    DataEventStacks dataStacks;
    std::vector<Group> groupStack;
    std::shared_ptr<const EventIdentity> identity;  // of the session that the latest event was in
};

}  // namespace corvane
