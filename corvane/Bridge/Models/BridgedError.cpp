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

}  // namespace corvane
