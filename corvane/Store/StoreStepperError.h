#pragma once

#include <corvane/Platform/Error.h>

#include <string>

namespace corvane {

/// A result row is not what the entity needs: `StoreStepper::Errors`. Domain "Corvane.StoreStepper.Errors".
class StoreStepperError : public Error {
  public:
    enum Code {
        badColumn = 0,        ///< the column holds no text or no bytes where some are needed
        badDataInColumn = 1,  ///< the column's contents do not decode as the entity requires
    };
    /// @param detail which column or what about it, for the message.
    StoreStepperError(Code code, const std::string& detail);
    StoreStepperError(const StoreStepperError&) = default;
    StoreStepperError& operator=(const StoreStepperError&) = default;
    ~StoreStepperError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
};

}  // namespace corvane
