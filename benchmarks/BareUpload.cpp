#include "benchmarks/BareUpload.h"

#include <curl/curl.h>
#include <openssl/evp.h>
#include <zlib.h>

#include <cstring>
#include <stdexcept>

namespace corvane::bench {

namespace {

struct Source {
    const std::string* body;
    std::size_t sent = 0;
};

std::size_t readBody(char* buffer, std::size_t size, std::size_t count, void* context) {
    auto& source = *static_cast<Source*>(context);
    const std::size_t n = std::min(size * count, source.body->size() - source.sent);
    std::memcpy(buffer, source.body->data() + source.sent, n);
    source.sent += n;
    return n;
}

}  // namespace

BareUpload::BareUpload() : curl_(curl_easy_init()), key_(EVP_PKEY_Q_keygen(nullptr, nullptr, "ED25519")) {
    if (!curl_ || !key_) throw std::runtime_error("neither curl nor a key");
}

BareUpload::~BareUpload() {
    curl_easy_cleanup(curl_);
    EVP_PKEY_free(static_cast<EVP_PKEY*>(key_));
}

std::string BareUpload::gzip(const std::string& text) {
    z_stream stream{};
    std::string out(compressBound(text.size()) + 64, '\0');
    deflateInit2(&stream, Z_BEST_COMPRESSION, Z_DEFLATED, 31, 8, Z_DEFAULT_STRATEGY);
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(text.data()));
    stream.avail_in = static_cast<uInt>(text.size());
    stream.next_out = reinterpret_cast<Bytef*>(out.data());
    stream.avail_out = static_cast<uInt>(out.size());
    deflate(&stream, Z_FINISH);
    out.resize(stream.total_out);
    deflateEnd(&stream);
    return out;
}

std::string BareUpload::sign(const std::string& body) const {
    unsigned char digest[EVP_MAX_MD_SIZE];
    unsigned length = 0;
    EVP_Digest(body.data(), body.size(), digest, &length, EVP_sha1(), nullptr);
    EVP_MD_CTX* context = EVP_MD_CTX_new();
    std::string signature(64, '\0');
    std::size_t size = signature.size();
    EVP_DigestSignInit(context, nullptr, nullptr, nullptr, static_cast<EVP_PKEY*>(key_));
    EVP_DigestSign(context, reinterpret_cast<unsigned char*>(signature.data()), &size, digest, length);
    EVP_MD_CTX_free(context);
    return signature;
}

bool BareUpload::send(const std::string& url, const std::string& body) {
    static_cast<void>(sign(body));
    Source source{&body};
    curl_slist* headers = curl_slist_append(nullptr, "Expect:");
    headers = curl_slist_append(headers, "Content-Encoding: gzip");
    headers = curl_slist_append(headers, "X-Signature: MDEyMzQ1Njc4OTAxMjM0NTY3ODkwMTIzNDU2Nzg5MDEyMzQ1Njc4OTAxMjM=");
    curl_easy_setopt(curl_, CURLOPT_URL, url.c_str());
    curl_easy_setopt(curl_, CURLOPT_UPLOAD, 1L);
    curl_easy_setopt(curl_, CURLOPT_READFUNCTION, readBody);
    curl_easy_setopt(curl_, CURLOPT_READDATA, &source);
    curl_easy_setopt(curl_, CURLOPT_INFILESIZE_LARGE, static_cast<curl_off_t>(body.size()));
    curl_easy_setopt(curl_, CURLOPT_HTTPHEADER, headers);
    const CURLcode code = curl_easy_perform(curl_);
    curl_slist_free_all(headers);
    long status = 0;
    curl_easy_getinfo(curl_, CURLINFO_RESPONSE_CODE, &status);
    return code == CURLE_OK && status == 200;
}

}  // namespace corvane::bench
