#include "tests/support/Documents.h"

#include <openssl/evp.h>
#include <openssl/pem.h>
#include <zlib.h>

#include <cstdint>
#include <cstring>
#include <memory>
#include <stdexcept>

namespace corvane::test {

std::string gunzip(const std::string& bytes) {
    std::uint32_t size = 0;  // stands at the end, in the byte order of most machines
    if (bytes.size() < sizeof size) throw std::runtime_error("not one whole gzip member");
    std::memcpy(&size, bytes.data() + bytes.size() - sizeof size, sizeof size);
    std::string out(size, '\0');
    z_stream stream{};
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(bytes.data()));
    stream.avail_in = static_cast<uInt>(bytes.size());
    stream.next_out = reinterpret_cast<Bytef*>(out.data());
    stream.avail_out = size;
    const bool isWhole = inflateInit2(&stream, 15 + 16) == Z_OK && inflate(&stream, Z_FINISH) == Z_STREAM_END;
    inflateEnd(&stream);
    if (!isWhole || stream.avail_in > 0) throw std::runtime_error("not one whole gzip member");
    return out;
}

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

std::vector<JSON> documentsAt(const ScriptedServer& server) {
    std::vector<JSON> documents;
    for (const auto& request : server.requests()) {
        const bool isWhole = request.header("Content-Length") == std::to_string(request.body.size());
        if (isWhole) documents.emplace_back(gunzip(request.body));
    }
    return documents;
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
