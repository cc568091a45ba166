#include "SocketStream.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>

namespace collector {

namespace {

using namespace std::chrono_literals;

constexpr std::chrono::seconds patience = 5s;
constexpr std::chrono::seconds longestFarewell = 1s;

bool isReady(socket_t socket, short events, std::chrono::milliseconds timeout) {
    pollfd entry{.fd = socket, .events = events, .revents = 0};
    int ready = 0;
    do {
        ready = poll(&entry, 1, static_cast<int>(timeout.count()));
    } while (ready < 0 && errno == EINTR);
    return ready > 0;
}

}  // namespace

SocketStream::SocketStream(socket_t socket) : socket_(socket) {}

SocketStream::~SocketStream() {
    // Closing while unread bytes are there resets the connection, and the client may lose the answer.
    shutdown(socket_, SHUT_WR);
    const auto deadline = std::chrono::steady_clock::now() + longestFarewell;
    while (true) {
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now());
        if (left <= 0ms || !isReady(socket_, POLLIN, left)) break;
        if (recv(socket_, buffer_.data(), buffer_.size(), 0) <= 0) break;
    }
    close(socket_);
}

bool SocketStream::is_readable() const {
    return begin_ < end_ || isReady(socket_, POLLIN, patience);
}

bool SocketStream::is_writable() const {
    return isReady(socket_, POLLOUT, patience);
}

ssize_t SocketStream::read(char* bytes, std::size_t size) {
    if (begin_ == end_) {
        if (!isReady(socket_, POLLIN, patience)) return -1;
        const ssize_t received = recv(socket_, buffer_.data(), buffer_.size(), 0);
        if (received <= 0) return received;
        begin_ = 0;
        end_ = static_cast<std::size_t>(received);
    }
    const std::size_t count = std::min(size, end_ - begin_);
    std::copy_n(buffer_.data() + begin_, count, bytes);
    begin_ += count;
    return static_cast<ssize_t>(count);
}

ssize_t SocketStream::write(const char* bytes, std::size_t size) {
    if (!is_writable()) return -1;
    return send(socket_, bytes, size, MSG_NOSIGNAL);
}

// Nobody asks who is on a loopback connection.
void SocketStream::get_remote_ip_and_port(std::string& address, int& port) const {
    address = "127.0.0.1";
    port = 0;
}

void SocketStream::get_local_ip_and_port(std::string& address, int& port) const {
    address = "127.0.0.1";
    port = 0;
}

}  // namespace collector
