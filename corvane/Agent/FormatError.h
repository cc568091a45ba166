#pragma once

#include <corvane/Platform/Error.h>

#include <string>

namespace corvane {

/// Bytes that are not what they should be: a message, a submission or an outcome that its writer cannot have meant, or
/// one that comes at a moment at which the protocol has no place for it. Internal.
class FormatError : public Error {
  public:
    explicit FormatError(std::string message);
    FormatError(const FormatError&) = default;
    FormatError& operator=(const FormatError&) = default;
    ~FormatError() override;
};

}  // namespace corvane
