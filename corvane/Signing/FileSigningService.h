#pragma once

#include <corvane/Platform/Mutex.h>
#include <corvane/Signing/SigningServiceType.h>

#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

struct evp_pkey_st;

namespace corvane {

/// Signs with an Ed25519 key of this installation, kept in a file.
///
/// The key is made on first use and belongs to whoever made it first: processes that share the directory agree on one.
/// Its file is 0600; beside it lies the public key, which a collector needs to verify signatures. Safe from any thread.
class FileSigningService final : public SigningServiceType {
  public:
    /// The private key, PKCS #8 in PEM.
    static constexpr std::string_view keyFileName = "com.veskar.corvane.signing-key.pem";
    /// The public key in PEM.
    static constexpr std::string_view publicKeyFileName = "com.veskar.corvane.signing-key.pub.pem";

    /// @param directory where the key is kept; nothing for the documents directory as it is at the first signature.
    explicit FileSigningService(std::optional<std::filesystem::path> directory = std::nullopt);
    ~FileSigningService() override;

    /// A signature of 64 bytes. Throws `SigningError`, `SystemError` when the key file cannot be read or made, and
    /// `InvalidArgument` when there is no documents directory. After an error the next call tries again.
    [[nodiscard]] std::string sign(std::string_view digest) override;

  private:
    using Key = std::shared_ptr<evp_pkey_st>;

    /// The key, read or made with the first use.
    [[nodiscard]] Key key() CORVANE_EXCLUDES(mutex_);

    Mutex mutex_;
    std::optional<std::filesystem::path> directory_ CORVANE_GUARDED_BY(mutex_);
    Key key_ CORVANE_GUARDED_BY(mutex_);  // nothing until the first use
};

}  // namespace corvane
