#include "tests/support/TLSServer.h"

#include "tests/support/Files.h"

#include <httplib.h>

#include <cstdlib>
#include <stdexcept>

namespace corvane::test {

TLSServer::TLSServer() {
    char directory[] = "/tmp/corvane-test-XXXXXX";
    if (!mkdtemp(directory)) throw std::runtime_error("cannot make a temporary directory");
    const std::filesystem::path key = std::filesystem::path(directory) / "key", own = key.parent_path() / "certificate";
    const std::string make =
        "openssl req -x509 -newkey ec -pkeyopt ec_paramgen_curve:P-256 -nodes -days 1 -subj /CN=test "
        "-addext subjectAltName=IP:127.0.0.1 -keyout " +
        key.string() + " -out " + own.string() + " 2>/dev/null";
    if (std::system(make.c_str()) != 0) throw std::runtime_error("the certificate cannot be made");
    certificate_ = readFile(own);
    server_ = std::make_unique<httplib::SSLServer>(own.c_str(), key.c_str());
    std::filesystem::remove_all(directory);
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
