#pragma once

#include <corvane/Transfer/TransferError.h>
#include <corvane/Transfer/TransferRequest.h>

#include <optional>
#include <string>

namespace corvane::test {

/// How a transfer ended: "200", the kind of the error, or "nothing".
inline std::string outcome(const std::optional<AnyError>& error, const std::optional<TransferResponse>& response) {
    if (!error) return response ? std::to_string(response->statusCode) : "nothing";
    constexpr const char* names[] = {"invalidRequest", "bodyUnavailable", "timedOut", "network",
                                     "unreachable",    "blocked",         "cancelled"};
    const auto* known = error->as<TransferError>();
    return known ? names[known->code()] : error->what();
}

}  // namespace corvane::test
