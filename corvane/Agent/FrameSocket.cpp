#include <corvane/Agent/FrameSocket.h>

#include <corvane/Agent/AgentMessage.h>
#include <corvane/Agent/FormatError.h>

#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>

namespace corvane {

namespace {

constexpr std::size_t prefixLength = 4;
constexpr std::size_t atOnce = std::size_t{64} * 1024;

// Memory of a burst is given back.
void dropFront(std::string& bytes, std::size_t& count) {
    bytes.erase(0, count);
    count = 0;
    if (bytes.empty() && bytes.capacity() > atOnce) std::string().swap(bytes);
}

}  // namespace

bool FrameSocket::receive() {
    char buffer[16 * 1024];
    for (std::size_t total = 0; total < atOnce;) {
        const ssize_t count = recv(socket_.get(), buffer, sizeof buffer, 0);
        if (count > 0) {
            in_.append(buffer, static_cast<std::size_t>(count));
            total += static_cast<std::size_t>(count);
            if (static_cast<std::size_t>(count) < sizeof buffer) return true;  // that was all, or there is a next time
        } else if (count == 0) {
            return false;
        } else if (errno != EINTR) {
            return errno == EAGAIN || errno == EWOULDBLOCK;
        }
    }
    return true;
}

std::optional<std::string> FrameSocket::next() {
    std::optional<std::string> message;
    if (in_.size() - taken_ >= prefixLength) {
        std::size_t length = 0;
        for (std::size_t i = 0; i < prefixLength; ++i) {
            length |= std::size_t{static_cast<unsigned char>(in_[taken_ + i])} << (8 * i);
        }
        if (length == 0 || length > agent::longestMessage) throw FormatError("the length of a message is wrong");
        if (in_.size() - taken_ - prefixLength >= length) {
            message = in_.substr(taken_ + prefixLength, length);
            taken_ += prefixLength + length;
        }
    }
    if (!message || taken_ == in_.size()) dropFront(in_, taken_);
    return message;
}

void FrameSocket::send(std::string_view message) {
    for (std::size_t i = 0; i < prefixLength; ++i) out_.push_back(static_cast<char>(message.size() >> (8 * i)));
    out_.append(message);
}

bool FrameSocket::flush() {
    while (sent_ < out_.size()) {
        const ssize_t count = ::send(socket_.get(), out_.data() + sent_, out_.size() - sent_, MSG_NOSIGNAL);
        if (count >= 0) {
            sent_ += static_cast<std::size_t>(count);
        } else if (errno == EAGAIN || errno == EWOULDBLOCK) {
            break;
        } else if (errno != EINTR) {
            return false;
        }
    }
    if (sent_ == out_.size() || sent_ > atOnce) dropFront(out_, sent_);
    return true;
}

bool FrameSocket::peerIsOwnUser() const {
    ucred peer{};
    socklen_t size = sizeof peer;
    return getsockopt(socket_.get(), SOL_SOCKET, SO_PEERCRED, &peer, &size) == 0 && peer.uid == geteuid();
}

}  // namespace corvane
