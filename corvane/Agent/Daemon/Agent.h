#pragma once

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Agent/Daemon/AgentProcess.h>
#include <corvane/Agent/Daemon/ClientList.h>
#include <corvane/Agent/Daemon/DirectoryWatch.h>
#include <corvane/Agent/Daemon/TaskBook.h>
#include <corvane/Agent/Daemon/UploadQueue.h>
#include <corvane/Platform/Descriptor.h>

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>

namespace corvane::transferd {

/// The transfer agent's loop: takes submissions from the spool into the journal, uploads them, and tells the hosts.
///
/// One thread, asleep until a client, the spool, a transfer or a timer has something for it.
class Agent final : private UploadQueue::Source, private ClientList::Handler {
  public:
    struct Options {
        std::chrono::milliseconds idleTime{};
        std::chrono::milliseconds retryDelay{};
        std::chrono::milliseconds patienceWithoutHost{};
        process::Inherited inherited = {};  ///< what the programs that it runs get back
    };

    /// Goes on with what the journal and the spool hold. Requires: the caller holds the directory's lock.
    Agent(const AgentDirectory& directory, Journal& journal, const Options& options);

    /// Returns when there has been nothing to do for the idle time, no server to be reached and no host for the
    /// patience without one, or there is no going on: the directory was removed, the journal is damaged.
    void run();

  private:
    using Clock = UploadQueue::Clock;
    using Client = ClientList::Client;
    using Owner = TaskBook::Owner;

    // For the upload queue.
    std::optional<HTTPTransfer> transfer(std::int64_t number) override;
    bool mayWait(std::int64_t number) override;
    void troubleChanged(const UploadQueue::Trouble& trouble, const std::vector<std::int64_t>& uploads) override;

    // For the clients.
    void request(Client& client, const agent::Request& request) override;
    void left(Client& client) override;
    void greet(Client& client, const agent::Hello& hello);
    void submit(Client& client, const std::string& token);
    void list(Client& client);
    void acknowledge(Client& client, const std::string& token);
    void describe(const Client& client, const agent::Describe& change);

    /// Since 1970.
    [[nodiscard]] static std::int64_t milliseconds();
    void importSpool();
    std::int64_t import(const std::string& token);
    void enqueue(std::int64_t number, const TransferSubmission& submission);
    void dropWithdrawn();
    void forget(std::int64_t number, const Client* reporter);
    [[nodiscard]] agent::Elsewhere elsewhere(std::int64_t number);
    void tell(Owner& owner, const UploadQueue::Trouble& trouble);
    void tellOfTroubles(Client& client);
    void round();
    void settleEnded();
    void settleJournal(Clock::time_point now);
    void reportProgress();
    void deliver();
    void deliver(Owner& owner);
    void deliver(Owner& owner, std::int64_t number);
    [[nodiscard]] Client* addressee(const Owner& owner, std::int64_t number);
    void answerFlushes();
    void wakeHosts(Clock::time_point now);
    [[nodiscard]] bool isDueToWake(const Owner& owner, Clock::time_point now) const;
    [[nodiscard]] bool hasClient(const Owner& owner) const;
    void waitForNews();
    [[nodiscard]] int millisecondsToTimer(Clock::time_point now);
    bool isIdle(Clock::time_point now);
    bool isAlone(Clock::time_point now);
    bool endsNow();

    const AgentDirectory& directory_;
    const Options options_;
    TaskBook book_;
    UploadQueue queue_;
    ClientList clients_;
    Descriptor listener_;
    DirectoryWatch watch_;
    bool spoolChanged_ = true;
    bool isRemoved_ = false;
    bool ownersChanged_ = false;
    std::optional<Clock::time_point> idleSince_;
    std::optional<Clock::time_point> aloneSince_;      // since when there is neither a host nor a server
    std::optional<Clock::time_point> acceptsAgainAt_;  // while the system has no descriptor for a connection
    std::optional<Clock::time_point> settlesAgainAt_;  // while the journal does not take what it is told
    std::chrono::milliseconds settleDelay_{0};
    std::optional<Clock::time_point> wakesFrom_;  // since when completions wait without a host
};

}  // namespace corvane::transferd
