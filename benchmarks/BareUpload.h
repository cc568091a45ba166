#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>

namespace corvane::bench {

/// What an upload cannot do without: gzip, SHA-1, an Ed25519 signature and libcurl, one after the other. Whatever can
/// be used again is kept from one document to the next: states, contexts, buffers, headers, the handle, the connection.
class BareUpload {
  public:
    explicit BareUpload(const std::string& url);
    BareUpload(const BareUpload&) = delete;
    BareUpload& operator=(const BareUpload&) = delete;
    ~BareUpload();

    /// Signs and sends a compressed body with PUT; false when it did not arrive.
    bool send(std::string_view body);

    /// Good until the next one.
    [[nodiscard]] std::string_view gzip(std::string_view text);

  private:
    struct State;

    void sign(std::string_view body);
    static std::size_t readBody(char* buffer, std::size_t size, std::size_t count, void* context);

    const std::unique_ptr<State> state_;
};

}  // namespace corvane::bench
