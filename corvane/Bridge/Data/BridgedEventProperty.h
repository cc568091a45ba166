#pragma once

#include <corvane/Bridge/Data/BridgedDataEventClass.h>
#include <corvane/Bridge/Data/BridgedEventPropertyRequirement.h>

#include <optional>
#include <string>
#include <utility>

namespace corvane {

/// A property that an event class declares. Callers see it as `CVEventProperty`. A value.
class BridgedEventProperty {
  public:
    /// @param name the property's name in the event's JSON; without one it is called like its data
    BridgedEventProperty(BridgedDataEventClass dataType, BridgedEventPropertyRequirement requirement,
                         std::optional<std::string> name = std::nullopt)
        : dataType_(std::move(dataType)), requirement_(requirement), name_(std::move(name)) {}

    [[nodiscard]] const BridgedDataEventClass& dataType() const { return dataType_; }
    [[nodiscard]] BridgedEventPropertyRequirement requirement() const { return requirement_; }
    /// The key under which the data is looked up: the name of its class.
    [[nodiscard]] const std::string& dataKey() const { return dataType_.dataName(); }
    [[nodiscard]] const std::string& name() const { return name_ ? *name_ : dataKey(); }

  private:
    BridgedDataEventClass dataType_;
    BridgedEventPropertyRequirement requirement_;
    std::optional<std::string> name_;
};

}  // namespace corvane
