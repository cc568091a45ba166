#pragma once

#include <chrono>
#include <filesystem>
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

}  // namespace corvane
