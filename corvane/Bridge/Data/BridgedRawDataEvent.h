#pragma once

#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Export.h>

#include <string>

namespace corvane {

/// A data event that is nothing but its name and a dictionary. Callers see it as `CVRawDataEvent`. Immutable.
///
///     tracker.pushDataEvent(std::make_shared<CVRawDataEvent>("Screen", CVDictionary{{"name", "home"}}));
class CORVANE_EXPORT BridgedRawDataEvent final : public BridgedDataEventType {
  public:
    BridgedRawDataEvent(std::string name, HostValue::Dictionary dictionary);
    BridgedRawDataEvent(const BridgedRawDataEvent&) = default;
    ~BridgedRawDataEvent() override;

    [[nodiscard]] const std::string& name() const { return name_; }
    [[nodiscard]] const HostValue::Dictionary& dictionary() const { return dictionary_; }

    [[nodiscard]] std::string dataName() const override { return name_; }
    [[nodiscard]] HostValue::Dictionary toDict() const override { return dictionary_; }

  private:
    const std::string name_;
    const HostValue::Dictionary dictionary_;
};

}  // namespace corvane
