#pragma once

#include <corvane/Bridge/Models/BridgedError.h>
#include <corvane/Bridge/Models/HostValue.h>
#include <corvane/Export.h>
#include <corvane/Models/AnyDataEventEntry.h>

#include <optional>
#include <string>

namespace corvane {

/// A host's object that turns itself into a value, for use inside arrays and dictionaries. Callers see it as
/// `CVDataType`. Text, numbers, dates, arrays and dictionaries need none: `HostValue` holds them as they are.
class CORVANE_EXPORT BridgedDataType {
  public:
    virtual ~BridgedDataType() = default;

    /// The object as a value. A failure returns nothing and fills `error`, unless that is nullptr, or throws; either
    /// way it fails the conversion of everything that holds the object. Called on the thread that converts, which is
    /// the one that pushes; the same object may be asked on several threads at once.
    [[nodiscard]] virtual std::optional<HostValue> toJsonValueAndReturnError(BridgedError* error) const = 0;
};

/// How a pushed data event behaves on its stack. Callers see it as `CVDataEventTraits`. A value.
struct BridgedDataEventTraits {
    bool onlyOnce = false;  ///< it leaves the stack with the first event that finds it
    bool unique = false;    ///< it takes the place of everything on the stack

    /// The same traits as the library's.
    [[nodiscard]] DataEventTraits traits() const {
        if (onlyOnce && unique) return {DataEventTrait::onlyOnce, DataEventTrait::unique};
        if (onlyOnce) return {DataEventTrait::onlyOnce};
        return unique ? DataEventTraits{DataEventTrait::unique} : DataEventTraits{};
    }
};

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
