#include <corvane/Bridge/Data/BridgedDataEventClass.h>

#include <corvane/Bridge/Models/BridgedDataEvent.h>

#include <utility>

namespace corvane {

BridgedDataEventClass::BridgedDataEventClass(std::string dataName)
    : BridgedDataEventClass(std::move(dataName), DataType::of<BridgedDataEvent>()) {}

BridgedDataEventClass::BridgedDataEventClass(std::string dataName, DataType type)
    : dataName_(std::move(dataName)), type_(type) {}

}  // namespace corvane
