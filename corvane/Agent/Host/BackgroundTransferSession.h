#pragma once

#include <corvane/Export.h>
#include <corvane/Transfer/TransferSession.h>

#include <chrono>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace corvane {

/// How background sessions find and use the transfer agent. A value.
struct TransferAgentOptions {
    /// The program; empty for the one that is installed, or was built, with the library.
    std::filesystem::path program = {};

    /// Where the agent keeps its socket, its journal and its spool; created with mode 0700. Empty for the folder
    /// "com.veskar.corvane.transfer-agent" in the documents directory. There is one agent for each user and directory;
    /// hosts that use one directory share it.
    std::filesystem::path directory = {};

    /// A program, by its absolute path, with its arguments. The agent runs it, with the session's identifier as one
    /// more argument, when completions wait for a host that is not running. It is run once until a host has connected,
    /// however many completions wait. No shell is involved. Empty: nothing is run.
    std::vector<std::string> wakeCommand = {};

    /// How long the agent may take to start, or to answer, before the transfers go on inside the process.
    std::chrono::milliseconds deadline = std::chrono::seconds(5);

    /// After this time without an answering agent, the next task tries it again.
    std::chrono::milliseconds holdOff = std::chrono::seconds(30);

    /// How long an agent that this process starts stays with no host connected and nothing to transfer.
    std::chrono::milliseconds idleTime = std::chrono::seconds(10);

    /// How long an agent that this process starts waits before it tries an unreachable server again, at first; the
    /// delay doubles with every failure, up to 5 minutes.
    std::chrono::milliseconds retryDelay = std::chrono::seconds(1);

    /// How long a task may wait for a server that cannot be reached, or that the way to is blocked, before it fails
    /// with `TransferError` unreachable or blocked.
    std::chrono::milliseconds patience = std::chrono::hours(24);

    /// How long an agent that this process starts goes on trying with no host connected, when no server that it has
    /// uploads for can be reached. It then ends; its tasks stay in its journal, and the next host that starts it goes
    /// on with them.
    std::chrono::milliseconds patienceWithoutHost = std::chrono::hours(1);
};

/// The transfer session whose transfers run in the transfer agent, a process of its own: they go on when this process
/// exits or is killed, and what ended meanwhile is reported to the next session of the same identifier and owner key.
///
/// A resumed task is on disk when `resume` returns, and from then on the agent's affair. A task whose completion
/// callback has returned is not reported again; one whose host was killed inside the callback is. The agent is started
/// with the session, answers are waited for on a thread of the library's own, and no call waits for the agent. When it
/// cannot be started, does not answer within the deadline or cannot be started again after it died, an error is logged
/// and the tasks of this session go on inside the process; the agent is told to leave them alone, so that only one that
/// it had started sending already can arrive twice. Tasks of earlier runs stay the agent's.
///
/// A server that cannot be reached, or that the way to is blocked (see `TransferError`), does not fail a task at once:
/// an error is logged when that begins, and the agent tries again with growing delays, for as long as the options'
/// patience. Other failures and answers are reported as they come. Of several sessions of one identifier and owner key,
/// in several processes, one is told of a task's end as its completion, and the others by `taskDidEndElsewhere`. What
/// is handed over (URL, headers, proxy) lies in the agent's directory, readable by the user alone, until it is through.
///
/// A task may be cancelled wherever it is, one of an earlier run or of another process too; sessions of its owner that
/// have not cancelled it are told that it has ended elsewhere. The agent is told in the background: a host that is
/// killed before the completion may leave the task running, or have nobody told of it. An agent that does not answer
/// within the deadline is given up, and stops the task when it goes on; one that was killed has left with the system
/// what is in its buffers. A task that another process has taken over from its agent goes on there.
///
/// Otherwise see `TransferSession`, and `InProcessTransferSession` for redirects, certificates and proxies.
///
///     TransferSession::setFactory(BackgroundTransferSession::factory({.wakeCommand = {"/usr/bin/player",
///     "--woken"}}));
class CORVANE_EXPORT BackgroundTransferSession final : public TransferSession {
  public:
    /// Whether the agent's program is installed, or was built, with the library. Looks at the disk.
    [[nodiscard]] static bool isAvailable();

    /// Opens background sessions with these options.
    [[nodiscard]] static Factory factory(TransferAgentOptions options = {});

    /// An empty `queue` means one of the session's own. Throws `std::system_error` or `SystemError` when the process
    /// has no thread or descriptor left for the library; an agent that is not to be had is no error.
    BackgroundTransferSession(const TransferSessionConfiguration& configuration,
                              std::weak_ptr<TransferSessionDelegate> delegate,
                              std::shared_ptr<SerialQueue> queue = nullptr, const TransferAgentOptions& options = {});
    BackgroundTransferSession(const BackgroundTransferSession&) = delete;
    BackgroundTransferSession& operator=(const BackgroundTransferSession&) = delete;
    /// The agent's tasks go on; those that run inside the process are cancelled.
    ~BackgroundTransferSession() override;

    [[nodiscard]] std::optional<std::string> description() const override;
    void setDescription(std::string description) override;
    std::shared_ptr<TransferTask> uploadTask(TransferRequest request, std::filesystem::path file) override;
    void tasks(Listing listing) override;
    void deliverPendingEvents() override;

  private:
    const std::shared_ptr<class BackgroundTransferCore> core_;
};

}  // namespace corvane
