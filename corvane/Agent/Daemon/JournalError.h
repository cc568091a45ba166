#pragma once

#include <corvane/Platform/Error.h>

#include <string>

namespace corvane::transferd {

/// The journal does not take a change, or does not give back what it holds: a full disk, damage, a later version's
/// file, a bound on what it keeps.
class JournalError : public Error {
  public:
    explicit JournalError(std::string message);
    JournalError(const JournalError&) = default;
    JournalError& operator=(const JournalError&) = default;
    ~JournalError() override;
};

}  // namespace corvane::transferd
