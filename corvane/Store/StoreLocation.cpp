#include <corvane/Store/StoreLocation.h>

#include <utility>

namespace corvane {

StoreLocation::StoreLocation(std::optional<std::string> name) : name_(std::move(name)) {}

StoreLocation StoreLocation::default_(std::string name) {
    return StoreLocation(std::move(name));
}

StoreLocation StoreLocation::memory() {
    return StoreLocation(std::nullopt);
}

std::string StoreLocation::description() const {
    return name_ ? "default(\"" + *name_ + "\")" : "memory";
}

}  // namespace corvane
