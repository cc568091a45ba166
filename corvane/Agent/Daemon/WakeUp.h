#pragma once

#include <corvane/Agent/Daemon/AgentProcess.h>

#include <string>
#include <vector>

namespace corvane::transferd {

/// Runs a program in a session of its own, with nothing of the agent but its environment; nobody waits for it. Throws
/// `std::bad_alloc`.
/// @param inherited what the agent had of its parent, which the program gets.
/// @return whether it could be started.
bool runDetached(const std::vector<std::string>& command, const process::Inherited& inherited);

}  // namespace corvane::transferd
