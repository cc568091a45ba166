#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace corvane::transferd {

/// Runs a program in a session of its own, with nothing of the agent but its environment; nobody waits for it.
/// @param mask the file mode mask that it gets.
/// @return whether it could be started.
bool runDetached(const std::vector<std::string>& command, mode_t mask) noexcept;

}  // namespace corvane::transferd
