#include <corvane/Agent/FormatError.h>

#include <utility>

namespace corvane {

FormatError::FormatError(std::string message) : Error("Corvane.FormatError", 0, std::move(message)) {}
FormatError::~FormatError() = default;

}  // namespace corvane
