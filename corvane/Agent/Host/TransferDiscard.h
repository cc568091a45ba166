#pragma once

#include <corvane/Agent/AgentDirectory.h>

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <string>

namespace corvane {

/// What the agents have made of it that their tasks are to be discarded. A value. Internal.
struct DiscardResult {
    /// Where there are several agents, the last of these that is true of one.
    enum class Status {
        nobody,    ///< no agent runs: nothing is sent, and what its journal names will find no body
        answered,  ///< nothing of the tasks is sent any more, and none is in the journal
        failed,    ///< one that runs does not know how to, hangs or has died: see `problem`
    };
    Status status = Status::nobody;
    /// Tasks that the agents which answered have dropped, with completions that nobody had acknowledged.
    std::int64_t dropped = 0;
    std::string problem;
};

/// Has transfer agents drop every task whose body has been removed from beneath a directory, whoever its owner is, also
/// one whose transfer has it open. What was submitted since has its body, and goes on. Internal.
///
/// The agents are that of the documents directory and those that sessions of this process have used. None is started:
/// the tasks that an agent's journal and spool keep fail with `TransferError`
/// bodyUnavailable when the next one runs. Sessions of these tasks, in every process, are told of them by
/// `taskDidEndElsewhere`, or of how they had ended; a task that runs inside a process is its session's to cancel.
class TransferDiscard {
  public:
    /// Begins, and waits for nothing. `bodiesBeneath` is made absolute. `done` is called once, on the agent thread,
    /// within the greatest deadline of `TransferAgentOptions` among the agents; it only enqueues. What is begun when
    /// the process exits ends as failed, on that thread; in a child made by fork, and once that thread has ended, it
    /// is dropped, with `done`. Throws `std::system_error` or `SystemError` when the process has no thread or
    /// descriptor left for the library. Any thread.
    static void start(std::filesystem::path bodiesBeneath, std::function<void(DiscardResult)> done);

    /// A session of this process uses an agent's directory; its first deadline counts. Any thread.
    static void noteDirectory(const AgentDirectory& directory, std::chrono::milliseconds deadline);
};

}  // namespace corvane
