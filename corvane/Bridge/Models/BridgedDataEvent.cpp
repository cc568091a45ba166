#include <corvane/Bridge/Models/BridgedDataEvent.h>

#include <corvane/Bridge/Models/HostValue.h>

#include <utility>

namespace corvane {

BridgedDataEvent::BridgedDataEvent(std::shared_ptr<const BridgedDataEventType> object) : object_(std::move(object)) {
    if (!object_) throw InvalidArgument("there is no data event");
}

JSON BridgedDataEvent::toDict() const {
    return detail::toJsonObject(object_->toDict());
}

void BridgedDataEvent::encode(Encoder&) const {
    throw DataEventError(DataEventError::internalError);
}

BridgedDataEvent BridgedDataEvent::decode(const JSON&) {
    throw DataEventError(DataEventError::internalError);
}

}  // namespace corvane
