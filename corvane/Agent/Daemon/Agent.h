#pragma once

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Agent/Daemon/AgentProcess.h>
#include <corvane/Agent/Daemon/ClientDesk.h>
#include <corvane/Agent/Daemon/DirectoryWatch.h>
#include <corvane/Agent/Daemon/HostWaker.h>
#include <corvane/Agent/Daemon/Intake.h>
#include <corvane/Agent/Daemon/TaskBook.h>
#include <corvane/Agent/Daemon/UploadQueue.h>
#include <corvane/Platform/Descriptor.h>

#include <chrono>
#include <cstdint>
#include <optional>
#include <vector>

namespace corvane::transferd {

/// The transfer agent's loop: takes submissions from the spool into the journal, uploads them, and tells the hosts.
///
/// One thread, asleep until a client, the spool, a transfer or a timer has something for it.
class Agent final : private UploadQueue::Source {
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

    // For the upload queue.
    std::optional<HTTPTransfer> transfer(std::int64_t number) override;
    bool mayWait(std::int64_t number) override;
    void troubleChanged(const UploadQueue::Trouble& trouble, const std::vector<std::int64_t>& uploads) override;

    /// One time through everything that can be done without waiting: spool, uploads, journal, clients.
    void round();
    /// Drops what hosts have withdrawn: they send it themselves, or have cancelled it.
    void dropWithdrawn();
    /// Tells the book how uploads ended.
    void completeEnded();
    /// Tells the journal what it could not take, less and less often: a full disk has room again some time, and nobody
    /// says when.
    void settleJournal(Clock::time_point now);
    void wakeHosts(Clock::time_point now);
    /// Sleeps until there is something to do, and takes in what clients and the watch have to say.
    void waitForNews();
    /// How long nothing is due by the agent's own timers; the greatest integer when none runs.
    [[nodiscard]] int millisecondsToTimer(Clock::time_point now) const;
    /// Whether there has been nothing to do for the idle time. Runs the timer of that.
    bool isIdle(Clock::time_point now);
    /// Whether there has been neither a host nor a server for the patience without one. Runs the timer of that.
    bool isAlone(Clock::time_point now);
    /// Whether there is still nothing to do once nobody can connect any more.
    bool endsNow();

    const AgentDirectory& directory_;
    const Options options_;
    TaskBook book_;
    UploadQueue queue_;
    Intake intake_;
    ClientDesk desk_;
    HostWaker waker_;
    Descriptor listener_;
    DirectoryWatch watch_;
    bool isRemoved_ = false;
    std::optional<Clock::time_point> idleSince_;
    std::optional<Clock::time_point> aloneSince_;      // since when there is neither a host nor a server
    std::optional<Clock::time_point> acceptsAgainAt_;  // while the system has no descriptor for a connection
    std::optional<Clock::time_point> settlesAgainAt_;  // while the journal does not take what it is told
    std::chrono::milliseconds settleDelay_{0};
};

}  // namespace corvane::transferd
