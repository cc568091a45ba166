#include <corvane/Signing/FileSigningService.h>

#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/PrivateFile.h>
#include <corvane/Signing/OpenSSLUse.h>
#include <corvane/Signing/SigningError.h>

#include <openssl/evp.h>
#include <openssl/pem.h>

#include <utility>

namespace corvane {

namespace {

struct FreeKey {
    void operator()(EVP_PKEY* key) const noexcept { EVP_PKEY_free(key); }
};
struct FreeContext {
    void operator()(EVP_MD_CTX* context) const noexcept { EVP_MD_CTX_free(context); }
};
struct FreeBuffer {
    void operator()(BIO* buffer) const noexcept { BIO_free(buffer); }
};
using Key = std::unique_ptr<EVP_PKEY, FreeKey>;
using Context = std::unique_ptr<EVP_MD_CTX, FreeContext>;
using Buffer = std::unique_ptr<BIO, FreeBuffer>;

/// A key file that wants a password must fail, not ask for one on the terminal.
int noPassword(char*, int, int, void*) {
    return -1;
}

/// What `write` puts into a buffer in memory.
template <class Write>
std::string written(Write write) {
    const Buffer buffer(BIO_new(BIO_s_mem()));
    char* text = nullptr;
    if (!buffer || write(buffer.get()) != 1) throw SigningError(SigningError::failed, "a key cannot be written");
    const long length = BIO_get_mem_data(buffer.get(), &text);
    return {text, static_cast<std::size_t>(length)};
}

std::string newKeyPEM() {
    const OpenSSLUse use;
    const Key key(EVP_PKEY_Q_keygen(nullptr, nullptr, "ED25519"));
    if (!key) throw SigningError(SigningError::failed, "no Ed25519 key can be made");
    return written(
        [&](BIO* out) { return PEM_write_bio_PKCS8PrivateKey(out, key.get(), nullptr, nullptr, 0, nullptr, nullptr); });
}

// The service may go while the process exits, or after it: OpenSSL has let go of its keys then.
void freeKey(EVP_PKEY* key) noexcept {
    try {
        const OpenSSLUse use;
        EVP_PKEY_free(key);
    } catch (const SigningError&) {
    }
}

struct KeyParts {
    std::shared_ptr<EVP_PKEY> key;
    std::string publicPEM;
};

KeyParts parse(const std::string& pem, const std::filesystem::path& file) {
    const OpenSSLUse use;
    const Buffer buffer(BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())));
    Key key(PEM_read_bio_PrivateKey(buffer.get(), nullptr, noPassword, nullptr));
    if (!key || EVP_PKEY_get_id(key.get()) != EVP_PKEY_ED25519) {
        throw SigningError(SigningError::badKey,
                           file.string() + " does not hold an Ed25519 key in PEM without password");
    }
    auto publicPEM = written([&](BIO* out) { return PEM_write_bio_PUBKEY(out, key.get()); });
    return {{key.release(), &freeKey}, std::move(publicPEM)};
}

/// The key serves without its public part, so a failure here is told and no more.
void ensureFile(const std::filesystem::path& file, const std::string& contents) {
    try {
        std::error_code ignored;
        if (std::filesystem::exists(file, ignored) && readWholeFile(file) == contents) return;
        replacePrivateFile(file, contents);
    } catch (const std::exception& error) {
        Log::shared().error("Failed to write the public signing key, error=%{public}@", error.what());
    }
}

}  // namespace

FileSigningService::FileSigningService(std::optional<std::filesystem::path> directory)
    : directory_(std::move(directory)) {}
FileSigningService::~FileSigningService() = default;

FileSigningService::Key FileSigningService::key() {
    const Lock lock(mutex_);
    if (key_) return key_;
    if (directory_) createPrivateDirectories(*directory_);
    const auto directory = directory_ ? *directory_ : DocumentsDirectory::create();
    const auto file = directory / keyFileName;
    std::error_code ignored;
    if (!std::filesystem::exists(file, ignored)) createPrivateFile(file, newKeyPEM());
    auto parts = parse(readWholeFile(file), file);
    ensureFile(directory / publicKeyFileName, parts.publicPEM);
    return key_ = std::move(parts.key);
}

std::string FileSigningService::sign(std::string_view digest) {
    const Key key = this->key();
    const OpenSSLUse use;
    const Context context(EVP_MD_CTX_new());
    std::string signature(64, '\0');
    std::size_t length = signature.size();
    if (!context || EVP_DigestSignInit(context.get(), nullptr, nullptr, nullptr, key.get()) != 1 ||
        EVP_DigestSign(context.get(), reinterpret_cast<unsigned char*>(signature.data()), &length,
                       reinterpret_cast<const unsigned char*>(digest.data()), digest.size()) != 1) {
        throw SigningError(SigningError::failed, "the signature cannot be computed");
    }
    signature.resize(length);
    return signature;
}

}  // namespace corvane
