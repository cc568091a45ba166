#pragma once

#include <cstdint>

namespace corvane {

/// How much was dropped because it was to be forgotten. A value.
struct ForgottenRecords {
    std::int64_t events = 0;     ///< not those in documents whose number is not known: see `Ledger`
    std::int64_t documents = 0;  ///< which were stored, or on their way
    bool operator==(const ForgottenRecords&) const = default;
};

}  // namespace corvane
