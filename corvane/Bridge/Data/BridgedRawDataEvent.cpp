#include <corvane/Bridge/Data/BridgedRawDataEvent.h>

#include <utility>

namespace corvane {

BridgedRawDataEvent::BridgedRawDataEvent(std::string name, HostValue::Dictionary dictionary)
    : name_(std::move(name)), dictionary_(std::move(dictionary)) {}
BridgedRawDataEvent::~BridgedRawDataEvent() = default;

}  // namespace corvane
