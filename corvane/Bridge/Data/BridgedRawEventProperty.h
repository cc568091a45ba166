#pragma once

#include <corvane/Bridge/Data/BridgedEventPropertyRequirement.h>

#include <string>
#include <utility>

namespace corvane {

/// A property of a raw event: the name of the data that fills it. Callers see it as `CVRawEventProperty`. A value.
class BridgedRawEventProperty {
  public:
    BridgedRawEventProperty(std::string dataName, BridgedEventPropertyRequirement requirement)
        : dataName_(std::move(dataName)), requirement_(requirement) {}

    [[nodiscard]] const std::string& dataName() const { return dataName_; }
    [[nodiscard]] BridgedEventPropertyRequirement requirement() const { return requirement_; }

  private:
    std::string dataName_;
    BridgedEventPropertyRequirement requirement_;
};

}  // namespace corvane
