#include "tests/support/TLSServer.h"

#include <httplib.h>
#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509v3.h>

#include <stdexcept>

namespace corvane::test {

namespace {

using Key = std::unique_ptr<EVP_PKEY, decltype(&EVP_PKEY_free)>;
using Certificate = std::unique_ptr<X509, decltype(&X509_free)>;

Certificate selfSigned(EVP_PKEY* key) {
    Certificate made(X509_new(), X509_free);
    X509_set_version(made.get(), 2);
    ASN1_INTEGER_set(X509_get_serialNumber(made.get()), 1);
    X509_gmtime_adj(X509_getm_notBefore(made.get()), -3600);
    X509_gmtime_adj(X509_getm_notAfter(made.get()), 3600);
    X509_set_pubkey(made.get(), key);
    X509_NAME* name = X509_get_subject_name(made.get());
    X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_ASC, reinterpret_cast<const unsigned char*>("test"), -1, -1, 0);
    X509_set_issuer_name(made.get(), name);
    X509_EXTENSION* address = X509V3_EXT_conf_nid(nullptr, nullptr, NID_subject_alt_name, "IP:127.0.0.1");
    X509_add_ext(made.get(), address, -1);
    X509_EXTENSION_free(address);
    if (X509_sign(made.get(), key, EVP_sha256()) == 0) throw std::runtime_error("the certificate cannot be signed");
    return made;
}

std::string pem(X509* certificate) {
    const std::unique_ptr<BIO, decltype(&BIO_free)> memory(BIO_new(BIO_s_mem()), BIO_free);
    PEM_write_bio_X509(memory.get(), certificate);
    char* text = nullptr;
    const long size = BIO_get_mem_data(memory.get(), &text);
    return {text, static_cast<std::size_t>(size)};
}

}  // namespace

TLSServer::TLSServer() {
    const Key key(EVP_EC_gen("P-256"), EVP_PKEY_free);
    const Certificate own = selfSigned(key.get());
    certificate_ = pem(own.get());
    server_ = std::make_unique<httplib::SSLServer>(own.get(), key.get());
    server_->Put(".*", [this](const httplib::Request&, httplib::Response&) { ++requests_; });
    server_->set_keep_alive_timeout(1);
    port_ = server_->bind_to_any_port("127.0.0.1");
    thread_ = std::thread([this] { server_->listen_after_bind(); });
}

TLSServer::~TLSServer() {
    while (!server_->is_running()) std::this_thread::yield();  // a stop before that would be lost
    server_->stop();
    thread_.join();
}

}  // namespace corvane::test
