#include <corvane/Bridge/Data/BridgedRawEventMirrorProperty.h>

#include <utility>

namespace corvane {

BridgedRawEventMirrorProperty::BridgedRawEventMirrorProperty(BridgedRawEventProperty rawEventProperty)
    : rawEventProperty_(std::move(rawEventProperty)) {}
BridgedRawEventMirrorProperty::~BridgedRawEventMirrorProperty() = default;

std::string_view BridgedRawEventMirrorProperty::dataKey() const {
    return rawEventProperty_.dataName();
}
bool BridgedRawEventMirrorProperty::isOptional() const {
    return rawEventProperty_.requirement() == BridgedEventPropertyRequirement::optional;
}
EventPropertyTrait BridgedRawEventMirrorProperty::trait() const {
    return EventPropertyTrait::data;
}
DataType BridgedRawEventMirrorProperty::dataType() const {
    return rawEventProperty_.dataType().type_;
}
bool BridgedRawEventMirrorProperty::isDataType(DataType type) const {
    return type == dataType();
}

}  // namespace corvane
