#pragma once

#include <corvane/Platform/Error.h>
#include <corvane/Transfer/TransferError.h>
#include <corvane/Transfer/TransferRequest.h>

#include <optional>

namespace corvane {

/// How a transfer ended, from libcurl's result to the delegate. A value. Internal.
struct TransferOutcome {
    /// What went wrong, a `TransferError` as a rule; nothing when the server's answer is in.
    std::optional<AnyError> error = {};
    /// The head of the answer; it may be there beside an error, when the connection broke inside the answer's body.
    std::optional<TransferResponse> response = {};
};

/// That of a transfer whose task was cancelled.
[[nodiscard]] inline TransferOutcome cancelledOutcome() {
    return {AnyError(TransferError(TransferError::Code::cancelled, "the transfer was cancelled")), std::nullopt};
}

}  // namespace corvane
