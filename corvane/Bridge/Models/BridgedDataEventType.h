#pragma once

#include <corvane/Bridge/Models/HostValue.h>
#include <corvane/Export.h>

#include <string>

namespace corvane {

/// A data event that is made of names and values known at run time. Callers see it as `CVDataEventType`; those who
/// have nothing but a name and a dictionary use `CVRawDataEvent`. Shared with the library, which asks it on the thread
/// that pushes it; the same object may be asked on several threads at once. What a member throws fails the push.
class CORVANE_EXPORT BridgedDataEventType {
  public:
    virtual ~BridgedDataEventType() = default;

    /// The name of the data event's class: the key under which events find it.
    [[nodiscard]] virtual std::string dataName() const = 0;
    /// The data event's properties. The keys are strings.
    [[nodiscard]] virtual HostValue::Dictionary toDict() const = 0;

  protected:
    BridgedDataEventType() = default;
    BridgedDataEventType(const BridgedDataEventType&) = default;
    BridgedDataEventType& operator=(const BridgedDataEventType&) = default;
};

}  // namespace corvane
