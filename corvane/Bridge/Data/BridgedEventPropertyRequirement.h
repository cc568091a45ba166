#pragma once

#include <corvane/Models/EventPropertyType.h>

namespace corvane {

/// Whether an event can do without a property: 0 is `required`, 1 is `optional`. Callers see it as
/// `CVEventPropertyRequirement`, and may hand over any integer: one that is not a value here fails the events that
/// declare it. The library's own enumeration, whose values are the ones that were published.
using BridgedEventPropertyRequirement = EventPropertyRequirement;

static_assert(static_cast<int>(BridgedEventPropertyRequirement::required) == 0 &&
              static_cast<int>(BridgedEventPropertyRequirement::optional) == 1);

}  // namespace corvane
