#include <corvane/Bridge/Models/BridgedError.h>

#include <utility>

namespace corvane {

BridgedError::BridgedError() = default;
BridgedError::BridgedError(std::string domain, int code, std::string message)
    : domain_(std::move(domain)), code_(code), message_(std::move(message)) {}
BridgedError::~BridgedError() = default;

BridgedError BridgedError::of(const AnyError& error) {
    if (const auto* own = error.as<Error>()) return {std::string(own->domain()), own->code(), own->what()};
    if (const auto* bridged = error.as<BridgedError>()) return *bridged;
    return {"Corvane.HostError", 0, error.what()};
}

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
