#include <corvane/Bridge/Models/BridgeError.h>

#include <utility>

namespace corvane {

namespace {
const char* describe(BridgeError::Code code) {
    switch (code) {
        case BridgeError::missingObject:
            return " is missing";
        case BridgeError::notUTF8:
            return " is not UTF-8";
        case BridgeError::unknownValue:
            return " is not a value of its enumeration";
        case BridgeError::repeatedProperty:
            return " is declared twice";
        case BridgeError::wrongQueue:
            return " was used outside the block that it was given to";
    }
    return " cannot be used";
}
}  // namespace

BridgeError::BridgeError(Code code, std::string what)
    : Error("Corvane.BridgeError", code, std::move(what) + describe(code)) {}
BridgeError::~BridgeError() = default;

}  // namespace corvane
