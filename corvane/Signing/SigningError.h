#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Error.h>

#include <string>

namespace corvane {

/// Why there is no signature. Domain "Corvane.SigningError".
class CORVANE_EXPORT SigningError : public Error {
  public:
    enum Code {
        unavailable = 0,  ///< the process is exiting: no signatures any more
        badKey = 1,       ///< the key file does not hold a key that can be used; it takes a person to mend it
        failed = 2,       ///< the computation failed
    };
    SigningError(Code code, const std::string& detail);
    SigningError(const SigningError&) = default;
    SigningError& operator=(const SigningError&) = default;
    ~SigningError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
};

}  // namespace corvane
