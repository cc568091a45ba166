#include <corvane/Transferd/ClientList.h>

#include <sys/socket.h>

#include <algorithm>
#include <exception>
#include <utility>

namespace corvane::transferd {

namespace {
// The list of all tasks that the agent may have fits; more waits only for somebody who does not read.
constexpr std::size_t mostUnsent = std::size_t{8} * 1024 * 1024;
}  // namespace

void ClientList::accept(int listener) {
    while (true) {
        Descriptor connected(accept4(listener, nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
        if (!connected) return;
        FrameSocket socket(std::move(connected));
        if (clients_.size() >= mostClients || !socket.peerIsOwnUser()) continue;
        clients_.emplace_back(++lastID_, std::move(socket));
    }
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
        while (const auto message = client.socket.next()) handler_.request(client, agent::decodeRequest(*message));
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
