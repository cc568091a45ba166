#include "tests/support/Documents.h"

#include <openssl/evp.h>
#include <openssl/pem.h>

#include <memory>

namespace corvane::test {

bool verifies(const std::string& publicPEM, const std::string& digest, const std::string& base64) {
    unsigned char signature[72] = {};  // of 64 bytes, which are 88 characters
    if (base64.size() != 88 ||
        EVP_DecodeBlock(signature, reinterpret_cast<const unsigned char*>(base64.data()), 88) < 0) {
        return false;
    }
    const std::unique_ptr<BIO, int (*)(BIO*)> buffer(BIO_new_mem_buf(publicPEM.data(), int(publicPEM.size())),
                                                     BIO_free);
    const std::unique_ptr<EVP_PKEY, void (*)(EVP_PKEY*)> key(
        PEM_read_bio_PUBKEY(buffer.get(), nullptr, nullptr, nullptr), EVP_PKEY_free);
    const std::unique_ptr<EVP_MD_CTX, void (*)(EVP_MD_CTX*)> context(EVP_MD_CTX_new(), EVP_MD_CTX_free);
    return key && EVP_DigestVerifyInit(context.get(), nullptr, nullptr, nullptr, key.get()) == 1 &&
           EVP_DigestVerify(context.get(), signature, 64, reinterpret_cast<const unsigned char*>(digest.data()),
                            digest.size()) == 1;
}

std::multiset<std::string> eventIDs(const std::vector<JSON>& documents) {
    std::multiset<std::string> identifiers;
    for (const auto& document : documents) {
        const auto events = document["data"]["events"].array().value();
        for (const auto& event : events) {
            identifiers.insert(event["data"]["event"]["eventID"].string().value());
        }
    }
    return identifiers;
}

}  // namespace corvane::test
