#pragma once

#include <corvane/Upload/SignerType.h>

#include <string>
#include <string_view>

namespace corvane {

/// Has the SHA-1 digest of a body signed by the process's signing service (`SigningServiceType::shared`). The header
/// text is the signature in base64. Keeps no state; safe from any thread.
class OstrelSigner final : public SignerType {
  public:
    OstrelSigner();
    OstrelSigner(const OstrelSigner&) = default;
    OstrelSigner& operator=(const OstrelSigner&) = default;
    ~OstrelSigner() override;

    /// Throws what the signing service throws, after a line in the log.
    [[nodiscard]] std::string sign(std::string_view body) override;
};

}  // namespace corvane
