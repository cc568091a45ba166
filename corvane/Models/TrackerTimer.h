#pragma once

#include <corvane/Platform/Date.h>
#include <corvane/Platform/StringMap.h>

namespace corvane {

/// A running timer of a tracker.
struct TrackerTimer {
    Date startTime;
};

/// By event name.
using TrackerTimers = StringMap<TrackerTimer>;

}  // namespace corvane
