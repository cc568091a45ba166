#pragma once

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Platform/Descriptor.h>

#include <sys/resource.h>
#include <sys/types.h>

#include <optional>
#include <string>

namespace corvane::transferd {

/// What makes a process an agent: it leaves its parent and everything that it has inherited behind.
namespace process {

/// What a process has of its parent, and the agent changes for itself.
struct Inherited {
    mode_t mask = 022;
    rlimit descriptors{};
};

/// Makes the process independent of whoever started it: default signals, no descriptors but the standard ones,
/// directory "/", file mode mask 077, as many descriptors as it may have: every connected host takes one. First of all,
/// while there is one thread.
Inherited leaveEverything() noexcept;

/// Goes on in a child that has no terminal and whose parent has ended, which ends this process.
void becomeDaemon() noexcept;

/// Holds the directory's lock; nothing when a living agent has it. Waits a moment for one that is about to end. Throws
/// `SystemError`.
[[nodiscard]] std::optional<Descriptor> lock(const AgentDirectory& directory);

/// Tells whoever started the process how that went, and lets go of the standard output.
void report(const std::string& line) noexcept;

}  // namespace process
}  // namespace corvane::transferd
