#pragma once

#include <string>
#include <string_view>

namespace corvane {

/// Turns the body of an upload into the text of its signature header.
class SignerType {
  public:
    virtual ~SignerType() = default;

    /// The signature of `body` as text that a header can hold. Throws what the signing failed with; the upload then
    /// goes out with the error in the header's place. May be called from several threads at once.
    [[nodiscard]] virtual std::string sign(std::string_view body) = 0;

  protected:
    SignerType() = default;
    SignerType(const SignerType&) = default;
    SignerType& operator=(const SignerType&) = default;
};

}  // namespace corvane
