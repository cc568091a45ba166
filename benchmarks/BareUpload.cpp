#include "benchmarks/BareUpload.h"

#include <curl/curl.h>
#include <openssl/evp.h>
#include <zlib.h>

#include <algorithm>
#include <cstring>
#include <stdexcept>

namespace corvane::bench {

struct BareUpload::State {
    z_stream stream{};
    std::string compressed;
    EVP_MD* sha1 = EVP_MD_fetch(nullptr, "SHA1", nullptr);
    EVP_PKEY* key = EVP_PKEY_Q_keygen(nullptr, nullptr, "ED25519");
    EVP_MD_CTX* context = EVP_MD_CTX_new();
    unsigned char signature[64]{};
    CURL* curl = curl_easy_init();
    curl_slist* headers = nullptr;
    std::string_view body;
    std::size_t sent = 0;
};

std::size_t BareUpload::readBody(char* buffer, std::size_t size, std::size_t count, void* context) {
    auto& state = *static_cast<State*>(context);
    const std::size_t n = std::min(size * count, state.body.size() - state.sent);
    std::memcpy(buffer, state.body.data() + state.sent, n);
    state.sent += n;
    return n;
}

BareUpload::BareUpload(const std::string& url) : state_(std::make_unique<State>()) {
    State& state = *state_;
    const int zlib = deflateInit2(&state.stream, Z_BEST_COMPRESSION, Z_DEFLATED, 31, 9, Z_DEFAULT_STRATEGY);
    if (zlib != Z_OK || !state.sha1 || !state.key || !state.context || !state.curl) {
        throw std::runtime_error("no zlib, no key or no curl");
    }
    for (const char* header :
         {"Expect:", "Content-Type: application/json; version=2", "User-Agent: com.example/1.0",
          "Content-Encoding: gzip", "X-Signature: MDEyMzQ1Njc4OTAxMjM0NTY3ODkwMTIzNDU2Nzg5MDEyMzQ1Njc4OTAxMjM="}) {
        state.headers = curl_slist_append(state.headers, header);
    }
    curl_easy_setopt(state.curl, CURLOPT_URL, url.c_str());
    curl_easy_setopt(state.curl, CURLOPT_NOSIGNAL, 1L);
    curl_easy_setopt(state.curl, CURLOPT_UPLOAD, 1L);
    curl_easy_setopt(state.curl, CURLOPT_READFUNCTION, readBody);
    curl_easy_setopt(state.curl, CURLOPT_READDATA, state_.get());
    curl_easy_setopt(state.curl, CURLOPT_HTTPHEADER, state.headers);
}

BareUpload::~BareUpload() {
    deflateEnd(&state_->stream);
    EVP_MD_free(state_->sha1);
    EVP_PKEY_free(state_->key);
    EVP_MD_CTX_free(state_->context);
    curl_easy_cleanup(state_->curl);
    curl_slist_free_all(state_->headers);
}

std::string_view BareUpload::gzip(std::string_view text) {
    z_stream& stream = state_->stream;
    std::string& out = state_->compressed;
    deflateReset(&stream);
    out.resize(std::max<std::size_t>(out.size(), deflateBound(&stream, static_cast<uLong>(text.size()))));
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(text.data()));
    stream.avail_in = static_cast<uInt>(text.size());
    stream.next_out = reinterpret_cast<Bytef*>(out.data());
    stream.avail_out = static_cast<uInt>(out.size());
    if (deflate(&stream, Z_FINISH) != Z_STREAM_END) throw std::runtime_error("a document was not compressed");
    return std::string_view(out).substr(0, stream.total_out);
}

void BareUpload::sign(std::string_view body) {
    State& state = *state_;
    unsigned char digest[EVP_MAX_MD_SIZE];
    unsigned length = 0;
    std::size_t size = sizeof state.signature;
    EVP_Digest(body.data(), body.size(), digest, &length, state.sha1, nullptr);
    EVP_DigestSignInit(state.context, nullptr, nullptr, nullptr, state.key);
    if (EVP_DigestSign(state.context, state.signature, &size, digest, length) != 1) {
        throw std::runtime_error("a document was not signed");
    }
}

bool BareUpload::send(std::string_view body) {
    State& state = *state_;
    sign(body);
    state.body = body;
    state.sent = 0;
    curl_easy_setopt(state.curl, CURLOPT_INFILESIZE_LARGE, static_cast<curl_off_t>(body.size()));
    long status = 0;
    const CURLcode code = curl_easy_perform(state.curl);
    curl_easy_getinfo(state.curl, CURLINFO_RESPONSE_CODE, &status);
    return code == CURLE_OK && status == 200;
}

}  // namespace corvane::bench
