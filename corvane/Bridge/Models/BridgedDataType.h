#pragma once

#include <corvane/Bridge/Models/BridgedError.h>
#include <corvane/Bridge/Models/HostValue.h>
#include <corvane/Export.h>

#include <optional>

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

}  // namespace corvane
