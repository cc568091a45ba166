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

void serve(int connection) {
    const int on = 1;
    setsockopt(connection, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
    std::string buffer;
    char piece[65536];
    for (;;) {
        auto end = buffer.find("\r\n\r\n");
        while (end == std::string::npos || buffer.size() < end + 4 + bodyLength(buffer)) {
            const ssize_t n = read(connection, piece, sizeof piece);
            if (n <= 0) {
                close(connection);
                return;
            }
            buffer.append(piece, static_cast<std::size_t>(n));
            if (end == std::string::npos) end = buffer.find("\r\n\r\n");
        }
        const bool answers = buffer.find(" /never") > buffer.find('\r');
        buffer.erase(0, end + 4 + bodyLength(buffer));
        constexpr std::string_view answer = "HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n";
        if (answers && write(connection, answer.data(), answer.size()) < 0) return;
    }
}

}  // namespace

Server::Server() {
    const int listener = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
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
            std::thread(serve, connection).detach();
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
