#pragma once

#include "Hub.h"

#include <httplib.h>

#include <cstddef>
#include <cstdint>
#include <mutex>
#include <set>
#include <string>

namespace collector {

/// The open connections of pages, each of which is sent the hub's messages as server-sent events. Each holds a thread
/// of the server's, so their number is bounded. Safe from any thread.
class Viewers {
  public:
    static constexpr std::size_t most = 16;

    explicit Viewers(const Hub& hub);

    /// Makes the response a stream of what happens, from behind the message that the page had last (the header
    /// "Last-Event-ID"); 503 when there are too many.
    void show(const httplib::Request& request, httplib::Response& response, socket_t socket);
    /// Breaks all connections off. The hub is closed by then.
    void disconnect();

  private:
    struct Place {
        std::uint64_t number = 0;
        bool isGreeted = false;
    };

    bool admit(socket_t socket);
    void leave(socket_t socket);
    [[nodiscard]] Place placeOf(const std::string& lastEventID) const;
    bool send(Place& place, socket_t socket, httplib::DataSink& sink) const;
    bool greet(Place& place, httplib::DataSink& sink) const;

    const Hub& hub_;
    const std::string run_;  // numbers of messages begin anew with each run of the program
    std::mutex mutex_;
    std::set<socket_t> sockets_;  // guarded by mutex_
};

}  // namespace collector
