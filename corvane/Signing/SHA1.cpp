#include <corvane/Signing/SHA1.h>

#include <corvane/Signing/OpenSSLUse.h>
#include <corvane/Signing/SigningError.h>

#include <openssl/evp.h>

namespace corvane {

std::string sha1Digest(std::string_view bytes) {
    const OpenSSLUse use;
    unsigned char digest[EVP_MAX_MD_SIZE];
    unsigned length = 0;
    if (EVP_Digest(bytes.data(), bytes.size(), digest, &length, EVP_sha1(), nullptr) != 1) {
        throw SigningError(SigningError::failed, "SHA-1 is not available");
    }
    return {reinterpret_cast<const char*>(digest), length};
}

}  // namespace corvane
