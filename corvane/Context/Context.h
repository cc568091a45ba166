#pragma once

#include <corvane/Context/ApplicationInfo.h>
#include <corvane/Context/DisplayInfo.h>
#include <corvane/Context/LocaleInfo.h>
#include <corvane/Context/MachineInfo.h>
#include <corvane/Context/OperatingSystemInfo.h>
#include <corvane/Context/ProcessInfo.h>
#include <corvane/Export.h>

namespace corvane {

class SessionManager;
class Tracker;

/// Pushes what is known of the surroundings: an `OperatingSystemInfo`, a `MachineInfo`, a `LocaleInfo`, an
/// `ApplicationInfo`, a `ProcessInfo`, and where there is a display server a `DisplayInfo`. Each takes the place of the
/// one before. Nothing in them identifies a person or a machine.
///
/// On a tracker they are in scope for its events, which carry those that they have properties for; in a session they
/// stand under the keys "operatingSystem", "machine", "locale", "application", "process" and "display". To push some of
/// them only, push those: `tracker->push(LocaleInfo::current())`.
///
/// Reads a dozen small files on the calling thread, a fraction of a millisecond: once, behind the start, will do. Any
/// thread; no other one may change the environment meanwhile. Never fails: what cannot be read is left out.
/// @{
CORVANE_EXPORT void pushContext(Tracker& tracker);
CORVANE_EXPORT void pushContext(SessionManager& sessions);
/// @}

}  // namespace corvane
