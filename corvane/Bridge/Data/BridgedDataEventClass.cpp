#include <corvane/Bridge/Data/BridgedDataEventClass.h>

#include <corvane/Bridge/Models/BridgedDataEvent.h>

#include <utility>

namespace corvane {

BridgedDataEventClass::BridgedDataEventClass(std::string dataName)
    : BridgedDataEventClass(std::move(dataName), DataType::of<BridgedDataEvent>()) {}

BridgedDataEventClass::BridgedDataEventClass(std::string dataName, DataType type)
    : dataName_(std::move(dataName)), type_(type) {}

BridgedRawDataEvent::BridgedRawDataEvent(std::string name, HostValue::Dictionary dictionary)
    : name_(std::move(name)), dictionary_(std::move(dictionary)) {}
BridgedRawDataEvent::~BridgedRawDataEvent() = default;

}  // namespace corvane
