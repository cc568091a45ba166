#include <corvane/Bridge/Data/BridgedEventClass.h>

#include <corvane/Bridge/Models/BridgedError.h>

#include <utility>

namespace corvane {

BridgedEventClass::BridgedEventClass(std::string eventName, Init init)
    : content_(std::make_shared<const Content>(Content{std::move(eventName), std::move(init)})) {}

std::vector<BridgedEventProperty> BridgedEventClass::eventProperties() const {
    const auto instance = content_->init ? content_->init() : nullptr;
    if (!instance) throw BridgeError(BridgeError::missingObject, "the instance of event class " + eventName());
    return instance->eventProperties();
}

}  // namespace corvane
