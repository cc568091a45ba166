#pragma once

#include <corvane/Platform/Date.h>

#include <corvane/Agent/TransferSubmission.h>

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace inspect {

/// One upload that was handed to the transfer agent.
struct AgentTask {
    std::string token = {};
    bool isSpooled = false;                      ///< the agent has not taken it yet
    bool isWithdrawn = false;                    ///< its host has taken it back
    std::optional<corvane::Date> accepted = {};  ///< by the agent
    std::optional<std::string> outcome = {};     ///< for people; nothing while it is not over
    corvane::TransferSubmission submission = {};

    [[nodiscard]] std::string state(bool agentRuns) const;
};

/// The transfer agent of a documents directory: what its directory says. It is not talked to, since whoever says hello
/// to it becomes one of its hosts; its journal has everything, whether it runs or not.
struct Agent {
    std::optional<std::int64_t> process = {};  ///< its number, while it runs
    std::vector<AgentTask> tasks = {};         ///< in the order in which they were handed over

    [[nodiscard]] static Agent read(const std::filesystem::path& directory, std::vector<std::string>& problems);
};

}  // namespace inspect
