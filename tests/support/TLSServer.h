#pragma once

#include <atomic>
#include <memory>
#include <string>
#include <thread>

namespace httplib {
class SSLServer;
}

namespace corvane::test {

/// An HTTPS server on a free port of the loopback address that answers every PUT with 200, with a certificate that
/// nobody vouches for but itself. Stopped and joined by the destructor.
class TLSServer {
  public:
    TLSServer();
    TLSServer(const TLSServer&) = delete;
    TLSServer& operator=(const TLSServer&) = delete;
    ~TLSServer();

    [[nodiscard]] std::string url() const { return "https://127.0.0.1:" + std::to_string(port_) + "/"; }
    /// The certificate in PEM form.
    [[nodiscard]] const std::string& certificate() const { return certificate_; }
    [[nodiscard]] int requests() const { return requests_; }

  private:
    std::unique_ptr<httplib::SSLServer> server_;
    std::string certificate_;
    std::atomic<int> requests_ = 0;
    int port_ = 0;
    std::thread thread_;
};

}  // namespace corvane::test
