#include <corvane/Testing/ScriptedServer.h>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <strings.h>
#include <sys/socket.h>
#include <unistd.h>
#include <zlib.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <stdexcept>

namespace corvane::test {

namespace {

bool sendAll(int connection, std::string_view bytes) {
    while (!bytes.empty()) {
        const ssize_t sent = send(connection, bytes.data(), bytes.size(), MSG_NOSIGNAL);
        if (sent <= 0) return false;
        bytes.remove_prefix(static_cast<std::size_t>(sent));
    }
    return true;
}

bool receiveMore(int connection, std::string& buffer) {
    char chunk[16 * 1024];
    const ssize_t got = recv(connection, chunk, sizeof chunk, 0);
    if (got > 0) buffer.append(chunk, static_cast<std::size_t>(got));
    return got > 0;
}

// The request line and the headers, without the empty line.
ScriptedServer::Request parseHead(std::string_view head) {
    ScriptedServer::Request request;
    const auto line = head.substr(0, head.find("\r\n"));
    const auto blank = line.find(' ');
    request.method = line.substr(0, blank);
    request.path = line.substr(blank + 1, line.rfind(' ') - blank - 1);
    head.remove_prefix(std::min(line.size() + 2, head.size()));
    while (!head.empty()) {
        const auto field = head.substr(0, head.find("\r\n"));
        const auto colon = field.find(':');
        const auto value = field.find_first_not_of(' ', colon + 1);
        request.headers.emplace_back(field.substr(0, colon),
                                     value == std::string_view::npos ? std::string_view() : field.substr(value));
        head.remove_prefix(std::min(field.size() + 2, head.size()));
    }
    return request;
}

}  // namespace

std::string ScriptedServer::Request::header(std::string_view name) const {
    for (const auto& [key, value] : headers) {
        if (key.size() == name.size() && strncasecmp(key.data(), name.data(), name.size()) == 0) return value;
    }
    return {};
}

std::string ScriptedServer::Request::content() const {
    std::uint32_t size = 0;  // stands at the end, in the byte order of most machines
    if (body.size() < sizeof size) throw std::runtime_error("not one whole gzip member");
    std::memcpy(&size, body.data() + body.size() - sizeof size, sizeof size);
    std::string out(size, '\0');
    z_stream stream{};
    stream.next_in = reinterpret_cast<Bytef*>(const_cast<char*>(body.data()));
    stream.avail_in = static_cast<uInt>(body.size());
    stream.next_out = reinterpret_cast<Bytef*>(out.data());
    stream.avail_out = size;
    const bool isWhole = inflateInit2(&stream, 15 + 16) == Z_OK && inflate(&stream, Z_FINISH) == Z_STREAM_END;
    inflateEnd(&stream);
    if (!isWhole || stream.avail_in > 0) throw std::runtime_error("not one whole gzip member");
    return out;
}

ScriptedServer::Reply ScriptedServer::Reply::status(int code, const Headers& headers, std::string_view body) {
    Reply reply;
    reply.bytes =
        "HTTP/1.1 " + std::to_string(code) + " Scripted\r\nContent-Length: " + std::to_string(body.size()) + "\r\n";
    for (const auto& [name, value] : headers) reply.bytes += name + ": " + value + "\r\n";
    reply.bytes.append("\r\n").append(body);
    return reply;
}

ScriptedServer::Reply ScriptedServer::Reply::partial(Ending ending) {
    return {.bytes = "HTTP/1.1 200 Scripted\r\nContent-Length: 1000000000\r\nX-Partial: yes\r\n\r\nabc",
            .ending = ending};
}

ScriptedServer::Reply ScriptedServer::Reply::hold() const {
    Reply reply = *this;
    reply.held = true;
    return reply;
}

ScriptedServer::ScriptedServer() : listener_(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t size = sizeof address;
    auto* generic = reinterpret_cast<sockaddr*>(&address);
    if (bind(listener_, generic, size) != 0 || listen(listener_, 64) != 0 ||
        getsockname(listener_, generic, &size) != 0) {
        throw std::runtime_error("cannot listen on the loopback address");
    }
    port_ = ntohs(address.sin_port);
    acceptor_ = std::thread([this] { acceptConnections(); });
}

ScriptedServer::~ScriptedServer() {
    std::map<int, std::thread> connections;
    {
        std::lock_guard lock(mutex_);
        stopping_ = true;
        for (const auto& [connection, thread] : connections_) shutdown(connection, SHUT_RDWR);
    }
    changed_.notify_all();
    shutdown(listener_, SHUT_RDWR);
    acceptor_.join();
    connections.swap(connections_);  // nobody adds any more
    for (auto& [connection, thread] : connections) {
        thread.join();
        close(connection);
    }
    close(listener_);
}

std::string ScriptedServer::url(std::string_view path) const {
    return "http://127.0.0.1:" + std::to_string(port_) + std::string(path);
}

void ScriptedServer::script(Reply reply, int times) {
    std::lock_guard lock(mutex_);
    for (int i = 0; i < times; ++i) script_.push_back(reply);
}

void ScriptedServer::release(int replies) {
    {
        std::lock_guard lock(mutex_);
        released_ += replies;
    }
    changed_.notify_all();
}

std::vector<ScriptedServer::Request> ScriptedServer::requests() const {
    std::lock_guard lock(mutex_);
    return requests_;
}

std::vector<JSON> ScriptedServer::documents() const {
    std::vector<JSON> documents;
    for (const auto& request : requests()) {
        const bool isWhole = request.header("Content-Length") == std::to_string(request.body.size());
        if (isWhole) documents.emplace_back(request.content());
    }
    return documents;
}

bool ScriptedServer::waitForRequests(std::size_t count) const {
    std::unique_lock lock(mutex_);
    return changed_.wait_for(lock, std::chrono::seconds(10), [&] { return requests_.size() >= count; });
}

void ScriptedServer::acceptConnections() {
    for (;;) {
        const int connection = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
        std::lock_guard lock(mutex_);
        if (stopping_ || connection < 0) {
            if (connection >= 0) close(connection);
            return;
        }
        // A descriptor stays open until the server is destroyed, so none comes twice.
        connections_.emplace(connection, std::thread([this, connection] { serve(connection); }));
    }
}

void ScriptedServer::serve(int connection) {
    std::string buffer;
    while (readRequest(connection, buffer)) {
    }
    shutdown(connection, SHUT_RDWR);
}

// One request and its answer; false when the connection is done with. `buffer` keeps what came too early.
bool ScriptedServer::readRequest(int connection, std::string& buffer) {
    std::size_t end = 0;
    while ((end = buffer.find("\r\n\r\n")) == std::string::npos) {
        if (!receiveMore(connection, buffer)) return false;
    }
    Request request = parseHead(std::string_view(buffer).substr(0, end));
    buffer.erase(0, end + 4);
    const Reply reply = nextReply();
    const auto length = static_cast<std::size_t>(std::strtoull(request.header("Content-Length").c_str(), nullptr, 10));
    const auto read = [&](std::size_t wanted) {
        while (buffer.size() < wanted && receiveMore(connection, buffer)) {
        }
        auto part = buffer.substr(0, wanted);
        buffer.erase(0, wanted);
        return part;
    };
    request.body = read(std::min(length, reply.bodyLimit));
    const auto left = length - request.body.size();
    const auto number = record(std::move(request));
    if (reply.held) {
        waitForRelease();
        const auto rest = read(left);
        std::lock_guard lock(mutex_);
        requests_[number].body += rest;
    }
    return answer(connection, reply);
}

bool ScriptedServer::answer(int connection, const Reply& reply) {
    using Ending = Reply::Ending;
    if (!sendAll(connection, reply.bytes)) return false;
    switch (reply.ending) {
        case Ending::keepAlive:
            return true;
        case Ending::close:
            return false;
        case Ending::reset: {
            sockaddr unspecified{};
            unspecified.sa_family = AF_UNSPEC;
            // Disconnects with a reset, and keeps the descriptor.
            static_cast<void>(connect(connection, &unspecified, sizeof unspecified));
            return false;
        }
        case Ending::endless:
            while (sendAll(connection, std::string(4096, 'x'))) {
            }
            return false;
        case Ending::trickle: {
            std::unique_lock lock(mutex_);
            while (!changed_.wait_for(lock, std::chrono::milliseconds(50), [this] { return stopping_; })) {
                if (!sendAll(connection, "X: y\r\n")) return false;
            }
            return false;
        }
        case Ending::silence: {
            std::unique_lock lock(mutex_);
            changed_.wait(lock, [this] { return stopping_; });
            return false;
        }
    }
    return false;
}

ScriptedServer::Reply ScriptedServer::nextReply() {
    std::lock_guard lock(mutex_);
    if (script_.empty()) return Reply::status(200);
    Reply reply = std::move(script_.front());
    script_.pop_front();
    return reply;
}

void ScriptedServer::waitForRelease() {
    std::unique_lock lock(mutex_);
    changed_.wait(lock, [this] { return released_ > 0 || stopping_; });
    --released_;
}

std::size_t ScriptedServer::record(Request request) {
    std::lock_guard lock(mutex_);
    requests_.push_back(std::move(request));
    changed_.notify_all();
    return requests_.size() - 1;
}

}  // namespace corvane::test
