#pragma once

#include <corvane/Agent/Host/BackgroundTransferSession.h>
#include <corvane/Platform/Descriptor.h>

#include <sys/types.h>

#include <filesystem>

namespace corvane {

/// Finds and starts the transfer agent's program. Internal.
class AgentProgram {
  public:
    /// A program that was started: the process that makes the agent and then ends, to be waited for, and the pipe on
    /// which it says "ready", or what is wrong, before it is closed.
    struct Started {
        pid_t process = -1;
        Descriptor output;
    };

    /// The program that belongs to this library; empty when there is none that the user can trust to be it.
    [[nodiscard]] static std::filesystem::path find();

    /// Starts the agent of a directory: nothing of this process but its environment reaches it, no descriptor, signal
    /// mask, working directory or terminal. Does not wait. Throws `SystemError`.
    [[nodiscard]] static Started start(const std::filesystem::path& program, const std::filesystem::path& directory,
                                       const TransferAgentOptions& options);
};

}  // namespace corvane
