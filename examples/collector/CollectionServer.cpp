#include "CollectionServer.h"

#include "Page.h"
#include "Refusal.h"
#include "SocketStream.h"

#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <string>
#include <string_view>

namespace collector {

namespace {

constexpr auto loopback = "127.0.0.1";
constexpr std::size_t largestBody = std::size_t{64} << 20;
constexpr auto encodingHeader = "Content-Encoding";
// Where the encoding is put out of the sight of the server, which would otherwise decompress the body by itself.
constexpr auto keptEncodingHeader = "X-Collector-Content-Encoding";

void keepBodyAsSent(httplib::Request& request) {
    const std::string encoding = request.get_header_value(encodingHeader);
    request.headers.erase(encodingHeader);
    request.headers.erase(keptEncodingHeader);
    request.headers.emplace(keptEncodingHeader, encoding);
}

std::string readBody(const httplib::Request& request, const httplib::ContentReader& reader) {
    if (!request.has_header("Content-Length") && !request.has_header("Transfer-Encoding")) {
        throw Refusal(400, "the request has no body");
    }
    if (request.is_multipart_form_data()) throw Refusal(400, "the body is a form");
    if (request.get_header_value<std::uint64_t>("Content-Length") > largestBody) {
        throw Refusal(413, "the body is too large");
    }
    std::string body;
    const bool isWhole = reader([&](const char* bytes, std::size_t size) {
        if (body.size() + size > largestBody) return false;
        body.append(bytes, size);
        return true;
    });
    if (!isWhole) throw Refusal(400, "the body is cut off or too large");
    return body;
}

// The connection that this thread of the server's is answering: a request does not tell.
thread_local socket_t currentSocket = INVALID_SOCKET;

// A page of another site whose name was made to point here must not read what was collected.
bool isLocalHost(const std::string& host) {
    const std::string name = host.substr(0, host.find(':'));
    return name == loopback || name == "localhost";
}

bool isOfPage(const httplib::Request& request) {
    constexpr std::array<std::string_view, 4> paths = {"/", "/page.css", "/page.js", "/events"};
    return (request.method == "GET" || request.method == "HEAD") && std::ranges::count(paths, request.path) > 0;
}

void write(const Answer& answer, httplib::Response& response) {
    response.status = answer.status;
    response.set_content(answer.text, "text/plain");
}

}  // namespace

CollectionServer::CollectionServer(Misbehaviour misbehaviour, Collector& collector)
    : misbehaviour_(misbehaviour), collector_(collector), viewers_(collector.hub()) {
    constexpr std::size_t uploadThreads = 8;
    // Pages that are open never take a thread from the uploads.
    new_task_queue = [] { return new httplib::ThreadPool(uploadThreads + Viewers::most); };
    set_socket_options([](socket_t socket) {
        const int yes = 1;  // unlike the server's default, which lets two programs share a port
        setsockopt(socket, SOL_SOCKET, SO_REUSEADDR, &yes, sizeof yes);
    });
    set_pre_routing_handler([this](const httplib::Request& request, httplib::Response& response) {
        if (request.method == "PUT") return HandlerResponse::Unhandled;
        if (isOfPage(request)) {
            if (isLocalHost(request.get_header_value("Host"))) return HandlerResponse::Unhandled;
            write({403, "this host name is not the collector's\n"}, response);
            return HandlerResponse::Handled;
        }
        response.set_header("Allow", "PUT");
        write(collector_.refuse(405, "the method is not PUT"), response);
        return HandlerResponse::Handled;
    });
    Put(R"([\s\S]*)", [this](const httplib::Request& request, httplib::Response& response,
                             const httplib::ContentReader& reader) { handle(request, response, reader); });
    servePage();
    set_error_handler([this](const httplib::Request&, httplib::Response& response) {
        if (!response.body.empty()) return;  // one of the answers above
        write(collector_.refuse(response.status, "the request cannot be understood"), response);
    });
}

void CollectionServer::servePage() {
    const auto serveFile = [this](const char* path, const char* text, const char* type) {
        Get(path, [text, type](const httplib::Request&, httplib::Response& response) {
            // What is shown comes from anywhere: nothing of it may run, and nothing may be loaded from elsewhere.
            response.set_header("Content-Security-Policy",
                                "default-src 'none'; script-src 'self'; style-src 'self'; connect-src 'self'; "
                                "img-src data:; base-uri 'none'; form-action 'none'; frame-ancestors 'none'");
            response.set_header("X-Content-Type-Options", "nosniff");
            response.set_header("Referrer-Policy", "no-referrer");
            response.set_header("Cache-Control", "no-store");
            response.set_content(text, type);
        });
    };
    serveFile("/", pageHTML, "text/html; charset=utf-8");
    serveFile("/page\\.css", pageStyle, "text/css; charset=utf-8");
    serveFile("/page\\.js", pageScript, "text/javascript; charset=utf-8");
    Get("/events", [this](const httplib::Request& request, httplib::Response& response) {
        response.set_header("Cache-Control", "no-store");
        response.set_header("X-Content-Type-Options", "nosniff");
        viewers_.show(request, response, currentSocket);
    });
}

std::optional<int> CollectionServer::bind(int port) {
    if (port == 0) {
        const int free = bind_to_any_port(loopback);
        return free > 0 ? std::optional(free) : std::nullopt;
    }
    return bind_to_port(loopback, port) ? std::optional(port) : std::nullopt;
}

void CollectionServer::serve() {
    listen_after_bind();
}

void CollectionServer::stopServing() {
    {
        const std::lock_guard lock(mutex_);
        isStopping_ = true;
    }
    stopping_.notify_all();
    collector_.hub().close();
    viewers_.disconnect();
    // Stopping a server that does not run yet does nothing, so the socket is made useless to it as well.
    if (!is_running()) {
        const socket_t socket = svr_sock_.load();
        if (socket != INVALID_SOCKET) shutdown(socket, SHUT_RDWR);
    }
    stop();
}

bool CollectionServer::process_and_close_socket(socket_t socket) {
    if (connections_++ < misbehaviour_.dropFirst) {
        ++dropped_;
        close(socket);
        return false;
    }
    SocketStream stream(socket);
    currentSocket = socket;
    bool isClosed = false;
    return process_request(stream, true, isClosed, keepBodyAsSent);
}

void CollectionServer::handle(const httplib::Request& request, httplib::Response& response,
                              const httplib::ContentReader& reader) {
    const Answer given = answer(request, reader);
    waitForDelay();
    write(given, response);
}

Answer CollectionServer::answer(const httplib::Request& request, const httplib::ContentReader& reader) {
    if (requests_++ < misbehaviour_.failFirst) {
        ++failed_;
        return {misbehaviour_.failStatus, "failed on purpose\n"};
    }
    try {
        return collector_.receive({.contentType = request.get_header_value("Content-Type"),
                                   .contentEncoding = request.get_header_value(keptEncodingHeader),
                                   .userAgent = request.get_header_value("User-Agent"),
                                   .signature = request.get_header_value("X-Veskar-ActionSignature"),
                                   .body = readBody(request, reader)});
    } catch (const Refusal& refusal) {
        return collector_.refuse(refusal.status(), refusal.what());
    }
}

void CollectionServer::waitForDelay() {
    if (misbehaviour_.delay.count() == 0) return;
    std::unique_lock lock(mutex_);
    stopping_.wait_for(lock, misbehaviour_.delay, [this] { return isStopping_; });
}

}  // namespace collector
