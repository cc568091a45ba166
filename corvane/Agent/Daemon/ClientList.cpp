#include <corvane/Agent/Daemon/ClientList.h>

#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <exception>
#include <utility>

namespace corvane::transferd {

namespace {
// The list of all tasks that the agent may have fits; more waits only for somebody who does not read.
constexpr std::size_t mostUnsent = std::size_t{8} * 1024 * 1024;
}  // namespace

// A few at a time, which are read before there is another one: an honest client's greeting comes with its connection.
bool ClientList::accept(int listener) {
    for (std::size_t taken = 0; taken < mostStrangers / 2; ++taken) {
        Descriptor connected(accept4(listener, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
        if (!connected && errno == ECONNABORTED) continue;
        if (!connected) return errno == EAGAIN || errno == EWOULDBLOCK || errno == EINTR;
        FrameSocket socket(std::move(connected));
        if (!socket.peerIsOwnUser()) continue;
        makeRoom();
        clients_.emplace_back(++lastID_, std::move(socket));
    }
    return true;
}

void ClientList::makeRoom() {
    const auto isStranger = [](const Client& client) { return !client.owner; };
    const auto strangers = std::count_if(clients_.begin(), clients_.end(), isStranger);
    if (static_cast<std::size_t>(strangers) < mostStrangers) return;
    clients_.erase(std::find_if(clients_.begin(), clients_.end(), isStranger));
}

void ClientList::dismissStrangers(Clock::time_point now) {
    std::erase_if(clients_, [now](const Client& client) { return !client.owner && client.greetsUntil <= now; });
}

ClientList::Clock::time_point ClientList::nextDismissal() const {
    auto next = Clock::time_point::max();
    for (const auto& client : clients_) {
        if (!client.owner) next = std::min(next, client.greetsUntil);
    }
    return next;
}

void ClientList::appendTo(std::vector<pollfd>& polled) const {
    for (const auto& client : clients_) {
        const short events = static_cast<short>(POLLIN | (client.socket.unsent() > 0 ? POLLOUT : 0));
        polled.push_back({client.socket.descriptor(), events, 0});
    }
}

void ClientList::proceed(std::span<const pollfd> polled) {
    auto client = clients_.begin();
    for (const auto& entry : polled) {
        if (client == clients_.end()) break;
        if (entry.revents != 0) read(*client);
        ++client;
    }
    removeLeaving();
}

void ClientList::read(Client& client) {
    const bool alive = client.socket.receive();
    try {
        while (const auto message = client.socket.next()) {
            const auto request = agent::decodeRequest(*message);
            if (request) {
                handler_.request(client, *request);
            } else if (!client.owner) {
                client.isLeaving = true;
                break;
            } else {
                client.send(agent::Unsupported{static_cast<unsigned char>(message->front())});
            }
        }
    } catch (const std::exception&) {
        client.isLeaving = true;
    }
    if (!alive) client.isLeaving = true;
}

void ClientList::flush() {
    for (auto& client : clients_) {
        if (!client.socket.flush() || client.socket.unsent() > mostUnsent) client.isLeaving = true;
    }
    removeLeaving();
}

void ClientList::removeLeaving() {
    for (auto client = clients_.begin(); client != clients_.end();) {
        if (!client->isLeaving) {
            ++client;
            continue;
        }
        static_cast<void>(client->socket.flush());  // why it has to leave
        handler_.left(*client);
        client = clients_.erase(client);
    }
}

ClientList::Client* ClientList::find(std::uint64_t id) {
    const auto found = std::find_if(clients_.begin(), clients_.end(), [id](const Client& one) { return one.id == id; });
    return found == clients_.end() ? nullptr : &*found;
}

bool ClientList::hasGuests() const {
    return std::any_of(clients_.begin(), clients_.end(), [](const Client& one) { return one.owner != nullptr; });
}

}  // namespace corvane::transferd
