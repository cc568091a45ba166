#pragma once

#include <corvane/Bridge/Data/BridgedEventClass.h>
#include <corvane/Models/EventProperty.h>

namespace corvane {

/// A property of an event class as the tracker reads it. Immutable.
class BridgedEventMirrorProperty final : public EventPropertyType {
  public:
    explicit BridgedEventMirrorProperty(BridgedEventProperty bridgedEventProperty);
    BridgedEventMirrorProperty(const BridgedEventMirrorProperty&) = default;
    ~BridgedEventMirrorProperty() override;

    [[nodiscard]] std::string_view dataKey() const override;
    [[nodiscard]] bool isOptional() const override;
    [[nodiscard]] EventPropertyTrait trait() const override;
    [[nodiscard]] DataType dataType() const override;
    [[nodiscard]] bool isDataType(DataType type) const override;

  private:
    const BridgedEventProperty bridgedEventProperty_;
};

}  // namespace corvane
