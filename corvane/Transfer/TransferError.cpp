#include <corvane/Transfer/TransferError.h>

#include <utility>

namespace corvane {

TransferError::TransferError(Code code, std::string message)
    : Error("Corvane.TransferError", static_cast<int>(code), std::move(message)) {}
TransferError::~TransferError() = default;

}  // namespace corvane
