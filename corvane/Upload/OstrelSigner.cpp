#include <corvane/Upload/OstrelSigner.h>

#include <corvane/Platform/Bytes.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/Log.h>
#include <corvane/Signing/SHA1.h>
#include <corvane/Signing/SigningServiceType.h>

namespace corvane {

namespace {

/// Digits are only made for a log that is read.
void logHex(const char* format, std::string_view bytes) {
    auto& log = Log::shared();
    if (log.isEnabled(LogLevel::debug)) log.debug(format, hexString(bytes));
}

std::string signature(std::string_view digest) {
    try {
        return SigningServiceType::shared()->sign(digest);
    } catch (...) {
        Log::shared().error("Failed to sign our data, error=%{public}@", AnyError::current().what());
        throw;
    }
}

}  // namespace

OstrelSigner::OstrelSigner() = default;
OstrelSigner::~OstrelSigner() = default;

std::string OstrelSigner::sign(std::string_view body) {
    const auto digest = sha1Digest(body);
    logHex("Generated SHA1 from data, SHA1=%@", digest);
    const auto bytes = signature(digest);
    logHex("Generated signature from SHA1, signature=%@", bytes);
    auto text = base64String(bytes);
    Log::shared().debug("Generated base64 from signature, base64=%@", text);
    return text;
}

}  // namespace corvane
