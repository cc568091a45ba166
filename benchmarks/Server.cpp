#include "benchmarks/Server.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <thread>

namespace corvane::bench {

namespace {

std::size_t bodyLength(std::string_view head) {
    const auto at = head.find("Content-Length: ");
    return at == std::string_view::npos ? 0 : std::strtoull(head.data() + at + 16, nullptr, 10);
}

/// Whether this body was the first of all.
bool isFirst(std::string_view body) {
    static std::mutex mutex;
    static std::optional<std::string> first;
    const std::lock_guard lock(mutex);
    if (!first) first = body;
    return *first == body;
}

void serve(int connection, Server::Manner manner) {
    const int on = 1;
    setsockopt(connection, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    std::string buffer;
    char piece[65536];
    for (;;) {
        auto end = buffer.find("\r\n\r\n");
        while (end == std::string::npos || buffer.size() < end + 4 + bodyLength(buffer)) {
            if (manner == Server::Manner::trickles) sleep(1);
            const ssize_t n = read(connection, piece, manner == Server::Manner::trickles ? 1 : sizeof piece);
            if (n <= 0) {
                close(connection);
                return;
            }
            buffer.append(piece, static_cast<std::size_t>(n));
            if (end == std::string::npos) end = buffer.find("\r\n\r\n");
        }
        const bool answers = buffer.find(" /never") > buffer.find('\r');
        const std::size_t length = bodyLength(buffer);
        const bool isRefused =
            manner == Server::Manner::refusesOne && isFirst(std::string_view(buffer).substr(end + 4, length));
        buffer.erase(0, end + 4 + length);
        const std::string_view answer = isRefused ? "HTTP/1.1 503 Later\r\nContent-Length: 0\r\n\r\n"
                                                  : "HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n";
        if (answers && write(connection, answer.data(), answer.size()) < 0) return;
    }
}

}  // namespace

Server::Server(Manner manner) {
    const int listener = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
    const int least = 1;
    if (manner == Manner::trickles) setsockopt(listener, SOL_SOCKET, SO_RCVBUF, &least, sizeof least);
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t length = sizeof address;
    if (listener < 0 || bind(listener, reinterpret_cast<sockaddr*>(&address), length) != 0 ||
        listen(listener, 64) != 0 || getsockname(listener, reinterpret_cast<sockaddr*>(&address), &length) != 0) {
        throw std::runtime_error("no port on the loopback address");
    }
    url_ = "http://127.0.0.1:" + std::to_string(ntohs(address.sin_port));
    process_ = fork();
    if (process_ < 0) throw std::runtime_error("no process for the server");
    if (process_ == 0) {
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        for (int connection = 0; (connection = accept(listener, nullptr, nullptr)) >= 0;) {
            std::thread(serve, connection, manner).detach();
        }
        _exit(1);
    }
    close(listener);
}

Server::~Server() {
    kill(process_, SIGKILL);
    waitpid(process_, nullptr, 0);
}

}  // namespace corvane::bench
