#pragma once

#include <corvane/Bridge/Data/BridgedEventProperty.h>
#include <corvane/Export.h>

#include <vector>

namespace corvane {

/// An instance of an event class that is made at run time. Callers see it as `CVEventType`. Made by its
/// `BridgedEventClass` on the tracker's queue, asked once, and released.
class CORVANE_EXPORT BridgedEventType {
  public:
    virtual ~BridgedEventType() = default;

    /// The properties in the order in which they stand in the event's JSON. What it throws fails the submission, and
    /// the next one asks again.
    [[nodiscard]] virtual std::vector<BridgedEventProperty> eventProperties() const = 0;
};

}  // namespace corvane
