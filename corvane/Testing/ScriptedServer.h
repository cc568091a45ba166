#pragma once

#include <corvane/Models/JSON.h>

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <map>
#include <mutex>
#include <string>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

namespace corvane::test {

/// A collector inside the test's process: a small HTTP server on a free port of the loopback address that keeps the
/// documents it is sent, and answers as a test tells it to.
///
/// It records every request and takes the replies in the order in which they were scripted, one per request; without a
/// script it answers 200, as a collector does that has taken a document. Every connection has a thread of its own and
/// serves one request after the other. The destructor closes all connections and joins all threads, also under a
/// transfer. The constructor throws `std::runtime_error` when the address cannot be listened on. Callable from any
/// thread.
///
///     ScriptedServer server;
///     server.script(ScriptedServer::Reply::status(503));   // the first document has to be sent again
///     const Endpoint endpoint(server.url("/in"), "test");
///     ...                                                  // the host records with an upload processor, and ends
///     ASSERT_TRUE(server.waitForRequests(1));
///     server.documents()[0]["data"]["events"][0]["metadata"]["name"].string();   // "ScreenView"
class ScriptedServer {
  public:
    /// Names and values, in order.
    using Headers = std::vector<std::pair<std::string, std::string>>;

    /// One request, as it was read.
    struct Request {
        std::string method;
        std::string path;  ///< the target as it stands in the request line, with its query
        Headers headers;
        std::string body;  ///< what was read of it

        /// The value of the first header of this name, capitals aside; empty without one.
        [[nodiscard]] std::string header(std::string_view name) const;
        /// What the gzip compression of the body holds. Throws `std::runtime_error` unless it is one whole member of
        /// at most 4 GiB.
        [[nodiscard]] std::string content() const;
    };

    /// What happens to one request.
    struct Reply {
        enum class Ending {
            keepAlive,  ///< a whole answer; the connection stays open
            close,      ///< closed after `bytes`
            reset,      ///< broken off after `bytes`, so that the client's system sees a reset
            trickle,    ///< a few bytes, a header or a piece of the body, now and then until the client closes
            endless,    ///< the body goes on until the client closes
            silence,    ///< nothing more is sent or read until the client closes or the server stops
        };
        std::string bytes;  ///< sent as they are
        Ending ending = Ending::keepAlive;
        bool held = false;            ///< wait for `release`, then read on and answer
        std::size_t bodyLimit = ~0u;  ///< stop reading the request's body after this many bytes

        /// A whole answer.
        static Reply status(int code, const Headers& headers = {}, std::string_view body = {});
        /// The beginning of a 200 answer that announces more than it sends.
        static Reply partial(Ending ending);
        /// These bytes, and a closed connection.
        static Reply raw(std::string bytes) { return {.bytes = std::move(bytes), .ending = Ending::close}; }
        /// No answer at all.
        static Reply never() { return {.bytes = {}, .ending = Ending::silence}; }
        /// The same, when `release` lets it go on.
        [[nodiscard]] Reply hold() const;
    };

    ScriptedServer();
    ScriptedServer(const ScriptedServer&) = delete;
    ScriptedServer& operator=(const ScriptedServer&) = delete;
    ~ScriptedServer();

    /// The URL of a path on this server, for an endpoint: "http://127.0.0.1:<port><path>".
    [[nodiscard]] std::string url(std::string_view path = "/") const;

    /// Appends replies for the next requests.
    void script(Reply reply, int times = 1);
    /// Lets this many held requests go on, now or when they are due.
    void release(int replies = 1);

    /// What came so far, in order.
    [[nodiscard]] std::vector<Request> requests() const;
    /// The documents that came whole, in order, whatever they were answered: a client that was killed may have sent the
    /// beginning of one, which is left out. Throws `std::runtime_error` for a request that is whole and no document.
    [[nodiscard]] std::vector<JSON> documents() const;
    /// Waits until this many requests have been read; false when they did not come within ten seconds.
    [[nodiscard]] bool waitForRequests(std::size_t count) const;

  private:
    void acceptConnections();
    void serve(int connection);
    bool answer(int connection, const Reply& reply);
    bool readRequest(int connection, std::string& buffer);
    Reply nextReply();
    void waitForRelease();
    std::size_t record(Request request);

    int listener_ = -1;
    int port_ = 0;
    std::thread acceptor_;

    mutable std::mutex mutex_;
    mutable std::condition_variable changed_;
    std::deque<Reply> script_;
    std::vector<Request> requests_;
    int released_ = 0;
    bool stopping_ = false;
    std::map<int, std::thread> connections_;
};

}  // namespace corvane::test
