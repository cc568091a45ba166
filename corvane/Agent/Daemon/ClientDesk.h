#pragma once

#include <corvane/Agent/Daemon/ClientList.h>
#include <corvane/Agent/Daemon/Intake.h>
#include <corvane/Agent/Daemon/TaskBook.h>
#include <corvane/Agent/Daemon/UploadQueue.h>

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace corvane::transferd {

/// What the agent hears from its clients and tells them: takes their requests, and hands out completions, progress and
/// troubles to whom they concern.
class ClientDesk final : private ClientList::Handler {
  public:
    using Client = ClientList::Client;
    using Owner = TaskBook::Owner;

    ClientDesk(TaskBook& book, UploadQueue& queue, Intake& intake)
        : book_(book), queue_(queue), intake_(intake), clients_(*this) {}

    [[nodiscard]] ClientList& clients() { return clients_; }
    [[nodiscard]] const ClientList& clients() const { return clients_; }
    [[nodiscard]] bool hasClient(const Owner& owner) const;

    /// Tells of what is over and of what has gone out, and answers the flushes that nothing more waits for.
    void deliver();
    /// A server cannot be reached, or can be again: tells the owners of these uploads, or those that were told.
    void tell(const UploadQueue::Trouble& trouble, const std::vector<std::int64_t>& uploads);
    /// Stops and forgets a task that a host has withdrawn, or that is discarded. All connections of its owner hear of
    /// it.
    void drop(std::int64_t number);
    /// Lets go of owners that nothing refers to any more.
    void dropOwners();

  private:
    void request(Client& client, const agent::Request& request) override;
    void left(Client& client) override;

    /// The first request of a client, which says whose tasks it asks for. One that speaks another version learns which
    /// this one is, and goes.
    void take(Client& client, const agent::Hello& hello);
    void take(Client& client, const agent::Submit& request);
    void take(Client& client, const agent::List& request);
    void take(Client& client, const agent::Acknowledge& request);
    void take(Client& client, const agent::Describe& request);
    void take(Client& client, const agent::Flush& request);
    void take(Client& client, const agent::Ping& request);
    void take(Client& client, const agent::Look& request);
    /// Answered once the journal has let go of the tasks.
    void take(Client& client, const agent::Discard& request);

    /// Lets go of a task. Whoever else waits for it than `reporter` hears how it ended, or that its host has taken it
    /// back.
    void forget(std::int64_t number, const Client* reporter);
    [[nodiscard]] agent::Elsewhere elsewhere(std::int64_t number);
    void reportProgress();
    void deliver(Owner& owner);
    /// Tells somebody of a completion, unless nobody is there or takes more just now.
    void deliver(Owner& owner, std::int64_t number);
    /// The host that submitted a task while it is there, and then the first of the same owner.
    [[nodiscard]] Client* addressee(const Owner& owner, std::int64_t number);
    void answerFlushes();
    void answerDiscards();
    void tell(const Owner& owner, const UploadQueue::Trouble& trouble);

    TaskBook& book_;
    UploadQueue& queue_;
    Intake& intake_;
    ClientList clients_;
    bool ownersChanged_ = false;
};

}  // namespace corvane::transferd
