#pragma once

#include <corvane/Agent/AgentMessage.h>
#include <corvane/Agent/Daemon/TaskBook.h>
#include <corvane/Agent/FrameSocket.h>

#include <poll.h>

#include <chrono>
#include <cstdint>
#include <list>
#include <set>
#include <span>
#include <vector>

namespace corvane::transferd {

/// The connections of the agent. One that breaks the protocol, belongs to another user or does not read what it is
/// sent is closed, and no other notices.
class ClientList {
  public:
    /// Connections that have not greeted: the oldest goes when there is another one, and each when its time is over.
    static constexpr std::size_t mostStrangers = 64;
    static constexpr auto timeToGreet = std::chrono::seconds(5);

    using Clock = std::chrono::steady_clock;

    struct Client {
        Client(std::uint64_t number, FrameSocket connected) : id(number), socket(std::move(connected)) {}

        std::uint64_t id;
        FrameSocket socket;
        TaskBook::Owner* owner = nullptr;  ///< from its greeting on
        std::set<std::int64_t> told;       ///< completions that it has not acknowledged
        std::set<std::uint64_t> troubles;  ///< that it was told of
        Clock::time_point greetsUntil = Clock::now() + timeToGreet;
        std::vector<agent::Discarded> discarded;  ///< answers that wait for the journal
        bool isFlushing = false;
        bool isLeaving = false;  ///< closed at the next opportunity

        void send(agent::Reply reply) { socket.send(agent::encode(std::move(reply))); }
    };

    /// What the clients say. What a call throws closes the client's connection.
    class Handler {
      public:
        virtual ~Handler() = default;
        virtual void request(Client& client, const agent::Request& request) = 0;
        virtual void left(Client& client) = 0;
    };

    explicit ClientList(Handler& handler) : handler_(handler) {}

    /// Takes connections that wait at a listening socket. False when the system has no descriptor or no memory for one:
    /// then not to be called again at once.
    [[nodiscard]] bool accept(int listener);
    /// Closes the connections that have not greeted in time.
    void dismissStrangers(Clock::time_point now);
    /// When the next one's time is over; the greatest time when there is none.
    [[nodiscard]] Clock::time_point nextDismissal() const;
    void appendTo(std::vector<pollfd>& polled) const;
    /// Reads, handles and sends, and lets go of those that left. `polled` are the entries that `appendTo` appended.
    void proceed(std::span<const pollfd> polled);
    void flush();

    [[nodiscard]] std::list<Client>& all() { return clients_; }
    [[nodiscard]] const std::list<Client>& all() const { return clients_; }
    [[nodiscard]] Client* find(std::uint64_t id);
    [[nodiscard]] bool hasGuests() const;

  private:
    /// Lets the oldest stranger go when there are as many as there may be.
    void makeRoom();
    /// Takes in what a client has sent, and has it handled.
    void read(Client& client);
    void removeLeaving();

    Handler& handler_;
    std::list<Client> clients_;
    std::uint64_t lastID_ = 0;
};

}  // namespace corvane::transferd
