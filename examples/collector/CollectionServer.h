#pragma once

#include "Collector.h"
#include "Upload.h"
#include "Viewers.h"

#include <httplib.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <mutex>
#include <optional>

namespace collector {

/// How the server is to misbehave, for people who want to see a sender cope.
struct Misbehaviour {
    std::int64_t dropFirst = 0;  ///< so many connections are closed without an answer
    std::int64_t failFirst = 0;  ///< after those, so many requests are answered with `failStatus`
    int failStatus = 503;
    std::chrono::milliseconds delay{0};  ///< before every answer
};

/// The HTTP side of the collector: takes PUT requests of any path on the loopback interface, one a connection, and
/// serves the page that shows them ("/") and the stream that feeds it ("/events").
///
/// It drives the connections itself, for two things that the underlying server has no switch for: the body as it was
/// sent, which is what the signature is of, and connections that break off.
class CollectionServer final : private httplib::Server {
  public:
    /// @param collector judges what arrives; outlives the server
    CollectionServer(Misbehaviour misbehaviour, Collector& collector);

    /// Binds to a port, or to a free one for 0. Returns it, or nothing when it cannot be had.
    std::optional<int> bind(int port);
    /// Serves until `stop`. Call `bind` before.
    void serve();
    /// Ends `serve` after the requests that are being answered. From any thread; `serve` may not have begun yet.
    void stopServing();

    [[nodiscard]] std::int64_t dropped() const { return dropped_.load(); }
    [[nodiscard]] std::int64_t failed() const { return failed_.load(); }

  private:
    bool process_and_close_socket(socket_t socket) override;
    void servePage();
    void handle(const httplib::Request& request, httplib::Response& response, const httplib::ContentReader& reader);
    [[nodiscard]] Answer answer(const httplib::Request& request, const httplib::ContentReader& reader);
    void waitForDelay();

    const Misbehaviour misbehaviour_;
    Collector& collector_;
    Viewers viewers_;
    std::atomic<std::int64_t> connections_ = 0;
    std::atomic<std::int64_t> requests_ = 0;
    std::atomic<std::int64_t> dropped_ = 0;
    std::atomic<std::int64_t> failed_ = 0;
    std::mutex mutex_;
    std::condition_variable stopping_;
    bool isStopping_ = false;  // guarded by mutex_
};

}  // namespace collector
