#include "Viewers.h"

#include <sys/socket.h>

#include <charconv>
#include <chrono>
#include <memory>
#include <string_view>

namespace collector {

namespace {

using namespace std::chrono_literals;

// How soon the thread of a page that went away is free again.
constexpr auto longestWait = 500ms;

bool isGone(socket_t socket) {
    char byte = 0;
    return recv(socket, &byte, 1, MSG_PEEK | MSG_DONTWAIT) == 0;
}

std::string runIdentifier() {
    return std::to_string(std::chrono::system_clock::now().time_since_epoch().count());
}

}  // namespace

Viewers::Viewers(const Hub& hub) : hub_(hub), run_(runIdentifier()) {}

void Viewers::show(const httplib::Request& request, httplib::Response& response, socket_t socket) {
    if (!admit(socket)) {
        response.status = 503;
        response.set_content("too many pages are open\n", "text/plain");
        return;
    }
    const auto place = std::make_shared<Place>(placeOf(request.get_header_value("Last-Event-ID")));
    response.set_chunked_content_provider(
        "text/event-stream",
        [this, place, socket](std::size_t, httplib::DataSink& sink) { return send(*place, socket, sink); },
        [this, socket](bool) { leave(socket); });
}

bool Viewers::admit(socket_t socket) {
    const std::lock_guard lock(mutex_);
    return !hub_.isClosed() && sockets_.size() < most && sockets_.insert(socket).second;
}

void Viewers::leave(socket_t socket) {
    const std::lock_guard lock(mutex_);
    sockets_.erase(socket);
    shutdown(socket, SHUT_RDWR);  // a page says nothing more that its thread should wait for
}

void Viewers::disconnect() {
    const std::lock_guard lock(mutex_);
    // A thread that is writing to a page that does not read would go on waiting for it.
    for (const socket_t socket : sockets_) shutdown(socket, SHUT_RDWR);
}

// "RUN-NUMBER"; anything else, or another run's, is somebody who has nothing yet.
Viewers::Place Viewers::placeOf(const std::string& lastEventID) const {
    const std::string_view text = lastEventID;
    Place place{.number = hub_.beforeOldest()};
    if (!text.starts_with(run_ + '-')) return place;
    const std::string_view digits = text.substr(run_.size() + 1);
    std::uint64_t number = 0;
    const auto [rest, error] = std::from_chars(digits.data(), digits.data() + digits.size(), number);
    if (error != std::errc() || rest != digits.data() + digits.size() || number > hub_.latest()) return place;
    if (number > place.number) place.number = number;
    return place;
}

// Told first: which run this is, and how far back it reaches, so that a page can say what it does not show.
bool Viewers::greet(Place& place, httplib::DataSink& sink) const {
    place.isGreeted = true;
    const std::string text = "retry: 1000\nevent: hello\ndata: {\"run\":\"" + run_ +
                             "\",\"behind\":" + std::to_string(place.number) +
                             ",\"most\":" + std::to_string(Hub::mostMessages) + "}\n\n";
    return sink.write(text.data(), text.size());
}

bool Viewers::send(Place& place, socket_t socket, httplib::DataSink& sink) const {
    if (!place.isGreeted) return greet(place, sink);
    const auto message = hub_.next(place.number, longestWait);
    if (hub_.isClosed() || isGone(socket)) return false;
    if (!message) return true;
    // Overtaken: it is dropped, and begins with what is kept when it comes back.
    if (message->number != place.number + 1) return false;
    place.number = message->number;
    const std::string text =
        "id: " + run_ + '-' + std::to_string(message->number) + "\ndata: " + *message->text + "\n\n";
    return sink.write(text.data(), text.size());
}

}  // namespace collector
