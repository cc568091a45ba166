#pragma once

#include <string>

namespace corvane::bench {

/// What an upload cannot do without: gzip, SHA-1, an Ed25519 signature and libcurl, one after the other.
class BareUpload {
  public:
    BareUpload();
    BareUpload(const BareUpload&) = delete;
    BareUpload& operator=(const BareUpload&) = delete;
    ~BareUpload();

    /// Signs and sends a compressed body with PUT; false when it did not arrive.
    bool send(const std::string& url, const std::string& body);

    [[nodiscard]] static std::string gzip(const std::string& text);
    [[nodiscard]] std::string sign(const std::string& body) const;

  private:
    void* curl_;
    void* key_;
};

}  // namespace corvane::bench
