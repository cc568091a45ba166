#pragma once

#include <filesystem>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>

namespace collector {

/// Verifies that a body was signed by the holder of a key: the header is the base64 text of an Ed25519 signature over
/// the SHA-1 of the body.
///
/// The sender makes its key with its first upload, so the file of the public key is read with the first request, and
/// again until it can be read. Safe from any thread.
class SignatureVerifier {
  public:
    explicit SignatureVerifier(std::filesystem::path publicKeyFile);
    ~SignatureVerifier();

    /// Throws `Refusal`: 401 for a signature that is missing or wrong, 503 when the key cannot be read.
    void verify(std::string_view body, const std::string& header);

  private:
    struct Key;

    std::shared_ptr<const Key> key();

    const std::filesystem::path file_;
    std::mutex mutex_;
    std::shared_ptr<const Key> key_;  // guarded by mutex_
};

}  // namespace collector
