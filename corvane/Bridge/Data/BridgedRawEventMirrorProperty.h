#pragma once

#include <corvane/Bridge/Data/BridgedRawEvent.h>
#include <corvane/Models/EventProperty.h>

namespace corvane {

/// A property of a raw event as the tracker reads it: data of any type under a name, which is always looked up, unless
/// it was declared by the class of a record that the tracker itself makes. Immutable.
class BridgedRawEventMirrorProperty final : public EventPropertyType {
  public:
    explicit BridgedRawEventMirrorProperty(BridgedRawEventProperty rawEventProperty);
    BridgedRawEventMirrorProperty(const BridgedRawEventMirrorProperty&) = default;
    ~BridgedRawEventMirrorProperty() override;

    [[nodiscard]] std::string_view dataKey() const override;
    [[nodiscard]] bool isOptional() const override;
    [[nodiscard]] EventPropertyTrait trait() const override;
    [[nodiscard]] DataType dataType() const override;
    [[nodiscard]] bool isDataType(DataType type) const override;

  private:
    const BridgedRawEventProperty rawEventProperty_;
};

}  // namespace corvane
