#pragma once

#include <httplib.h>

#include <array>
#include <cstddef>
#include <string>

namespace collector {

/// One connection as the HTTP server reads and writes it. Owns the socket; reading and writing give up after a few
/// seconds without progress.
class SocketStream final : public httplib::Stream {
  public:
    explicit SocketStream(socket_t socket);
    SocketStream(const SocketStream&) = delete;
    SocketStream& operator=(const SocketStream&) = delete;
    /// Closes the connection so that the answer arrives even if the client is still sending.
    ~SocketStream() override;

    bool is_readable() const override;
    bool is_writable() const override;
    ssize_t read(char* bytes, std::size_t size) override;
    ssize_t write(const char* bytes, std::size_t size) override;
    void get_remote_ip_and_port(std::string& address, int& port) const override;
    void get_local_ip_and_port(std::string& address, int& port) const override;
    socket_t socket() const override { return socket_; }

  private:
    const socket_t socket_;
    std::array<char, 16 * 1024> buffer_;  // headers are read byte by byte
    std::size_t begin_ = 0;
    std::size_t end_ = 0;
};

}  // namespace collector
