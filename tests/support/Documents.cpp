#include "tests/support/Documents.h"

#include <openssl/evp.h>
#include <openssl/pem.h>
#include <zlib.h>

#include <memory>
#include <stdexcept>

namespace corvane::test {

std::string gunzip(const std::string& bytes) {
    z_stream stream{};
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(bytes.data()));
    stream.avail_in = static_cast<uInt>(bytes.size());
    if (inflateInit2(&stream, 15 + 16) != Z_OK) throw std::runtime_error("inflateInit2");
    std::string out;
    int status = Z_OK;
    while (status == Z_OK) {
        char buffer[16384];
        stream.next_out = reinterpret_cast<Bytef*>(buffer);
        stream.avail_out = sizeof buffer;
        status = inflate(&stream, Z_NO_FLUSH);
        out.append(buffer, sizeof buffer - stream.avail_out);
    }
    const bool isWhole = status == Z_STREAM_END && stream.avail_in == 0;
    inflateEnd(&stream);
    if (!isWhole) throw std::runtime_error("not one whole gzip member");
    return out;
}

bool verifies(const std::string& publicPEM, const std::string& digest, const std::string& signature) {
    const std::unique_ptr<BIO, int (*)(BIO*)> buffer(BIO_new_mem_buf(publicPEM.data(), int(publicPEM.size())),
                                                     BIO_free);
    const std::unique_ptr<EVP_PKEY, void (*)(EVP_PKEY*)> key(
        PEM_read_bio_PUBKEY(buffer.get(), nullptr, nullptr, nullptr), EVP_PKEY_free);
    const std::unique_ptr<EVP_MD_CTX, void (*)(EVP_MD_CTX*)> context(EVP_MD_CTX_new(), EVP_MD_CTX_free);
    return key && EVP_DigestVerifyInit(context.get(), nullptr, nullptr, nullptr, key.get()) == 1 &&
           EVP_DigestVerify(context.get(), reinterpret_cast<const unsigned char*>(signature.data()), signature.size(),
                            reinterpret_cast<const unsigned char*>(digest.data()), digest.size()) == 1;
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
