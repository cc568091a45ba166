#pragma once

#include <filesystem>
#include <ostream>

namespace inspect {

/// Prints a line for each document that comes, goes to the agent or is over, and for each change of the ledger, looking
/// twice a second, until the process is ended or the output fails.
void tail(std::ostream& out, const std::filesystem::path& directory);

}  // namespace inspect
