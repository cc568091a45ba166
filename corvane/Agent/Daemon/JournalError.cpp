#include <corvane/Agent/Daemon/JournalError.h>

#include <utility>

namespace corvane::transferd {

JournalError::JournalError(std::string message) : Error("Corvane.JournalError", 0, std::move(message)) {}
JournalError::~JournalError() = default;

}  // namespace corvane::transferd
