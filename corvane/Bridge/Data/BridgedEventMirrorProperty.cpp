#include <corvane/Bridge/Data/BridgedEventMirrorProperty.h>

#include <utility>

namespace corvane {

BridgedEventMirrorProperty::BridgedEventMirrorProperty(BridgedEventProperty bridgedEventProperty)
    : bridgedEventProperty_(std::move(bridgedEventProperty)) {}
BridgedEventMirrorProperty::~BridgedEventMirrorProperty() = default;

std::string_view BridgedEventMirrorProperty::dataKey() const {
    return bridgedEventProperty_.dataKey();
}
bool BridgedEventMirrorProperty::isOptional() const {
    return bridgedEventProperty_.requirement() == BridgedEventPropertyRequirement::optional;
}
EventPropertyTrait BridgedEventMirrorProperty::trait() const {
    return EventPropertyTrait::data;
}
DataType BridgedEventMirrorProperty::dataType() const {
    return bridgedEventProperty_.dataType().type_;
}
bool BridgedEventMirrorProperty::isDataType(DataType type) const {
    return type == dataType();
}

}  // namespace corvane
