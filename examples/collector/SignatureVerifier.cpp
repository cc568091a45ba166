#include "SignatureVerifier.h"

#include "Refusal.h"

#include <openssl/evp.h>
#include <openssl/pem.h>

#include <cstdio>
#include <utility>

namespace collector {

namespace {

constexpr std::size_t signatureSize = 64;

template <auto release>
struct Releaser {
    template <class T>
    void operator()(T* handle) const {
        static_cast<void>(release(handle));
    }
};
using File = std::unique_ptr<std::FILE, Releaser<&std::fclose>>;
using Context = std::unique_ptr<EVP_MD_CTX, Releaser<&EVP_MD_CTX_free>>;

// The signature's bytes; empty when the text is not one. Only the canonical base64 form is one.
std::string decodedSignature(const std::string& base64) {
    std::string bytes(base64.size(), '\0');
    const int size =
        EVP_DecodeBlock(reinterpret_cast<unsigned char*>(bytes.data()),
                        reinterpret_cast<const unsigned char*>(base64.data()), static_cast<int>(base64.size()));
    if (size < static_cast<int>(signatureSize)) return {};
    bytes.resize(signatureSize);                 // without the zeros that stand for the padding
    std::string again(base64.size() + 1, '\0');  // the encoder ends its text with a NUL
    EVP_EncodeBlock(reinterpret_cast<unsigned char*>(again.data()),
                    reinterpret_cast<const unsigned char*>(bytes.data()), static_cast<int>(bytes.size()));
    again.pop_back();
    return again == base64 ? bytes : std::string();
}

std::string sha1Digest(std::string_view bytes) {
    std::string digest(20, '\0');
    if (EVP_Digest(bytes.data(), bytes.size(), reinterpret_cast<unsigned char*>(digest.data()), nullptr, EVP_sha1(),
                   nullptr) != 1) {
        throw Refusal(503, "SHA-1 is not available");
    }
    return digest;
}

}  // namespace

struct SignatureVerifier::Key {
    std::unique_ptr<EVP_PKEY, Releaser<&EVP_PKEY_free>> handle;
};

SignatureVerifier::SignatureVerifier(std::filesystem::path publicKeyFile) : file_(std::move(publicKeyFile)) {}
SignatureVerifier::~SignatureVerifier() = default;

std::shared_ptr<const SignatureVerifier::Key> SignatureVerifier::key() {
    const std::lock_guard lock(mutex_);
    if (key_) return key_;
    const File file(std::fopen(file_.c_str(), "re"));
    if (!file) throw Refusal(503, "the public key cannot be read yet");
    auto key = std::make_shared<Key>();
    key->handle.reset(PEM_read_PUBKEY(file.get(), nullptr, nullptr, nullptr));
    if (!key->handle || EVP_PKEY_get_id(key->handle.get()) != EVP_PKEY_ED25519) {
        throw Refusal(503, "the public key file does not hold an Ed25519 key in PEM");
    }
    return key_ = std::move(key);
}

void SignatureVerifier::verify(std::string_view body, const std::string& header) {
    if (header.empty()) throw Refusal(401, "the signature is missing");
    if (header.starts_with("SigningFailure=")) throw Refusal(401, "the sender could not sign");
    const std::string signature = decodedSignature(header);
    if (signature.empty()) throw Refusal(401, "the signature is not 64 bytes in base64");
    const auto publicKey = key();
    const std::string digest = sha1Digest(body);
    const Context context(EVP_MD_CTX_new());
    if (!context || EVP_DigestVerifyInit(context.get(), nullptr, nullptr, nullptr, publicKey->handle.get()) != 1 ||
        EVP_DigestVerify(context.get(), reinterpret_cast<const unsigned char*>(signature.data()), signature.size(),
                         reinterpret_cast<const unsigned char*>(digest.data()), digest.size()) != 1) {
        throw Refusal(401, "the signature is wrong");
    }
}

}  // namespace collector
