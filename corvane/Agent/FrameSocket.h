#pragma once

#include <corvane/Platform/Descriptor.h>

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace corvane {

/// One end of a connection between the library and the transfer agent: messages behind their length (4 bytes, lowest
/// first), sent and received without ever waiting. Lives on one thread. Internal.
class FrameSocket {
  public:
    /// Takes a connected, non-blocking socket.
    explicit FrameSocket(Descriptor socket) : socket_(std::move(socket)) {}

    [[nodiscard]] int descriptor() const { return socket_.get(); }

    /// Reads what is there, up to a bound that keeps one peer from holding up the others. False when the connection
    /// has ended; what came before is still handed out.
    [[nodiscard]] bool receive();

    /// The next whole message, if it is in. Throws `FormatError` when the peer announces one that is empty or too
    /// long: nothing can be read behind that.
    [[nodiscard]] std::optional<std::string> next();

    /// Queues a message; `flush` sends it.
    void send(std::string_view message);

    /// Sends what the system takes. False when the connection has ended.
    [[nodiscard]] bool flush();

    /// Bytes that wait for the peer to read.
    [[nodiscard]] std::size_t unsent() const { return out_.size() - sent_; }

    /// Whether the process at the other end belongs to the user of this one.
    [[nodiscard]] bool peerIsOwnUser() const;

  private:
    Descriptor socket_;
    std::string in_;
    std::size_t taken_ = 0;  // of in_
    std::string out_;
    std::size_t sent_ = 0;  // of out_
};

}  // namespace corvane
