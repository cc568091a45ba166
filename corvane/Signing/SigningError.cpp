#include <corvane/Signing/SigningError.h>

namespace corvane {

SigningError::SigningError(Code code, const std::string& detail)
    : Error("Corvane.SigningError", code, "cannot sign: " + detail) {}
SigningError::~SigningError() = default;

}  // namespace corvane
