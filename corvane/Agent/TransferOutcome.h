#pragma once

#include <corvane/Platform/Error.h>
#include <corvane/Transfer/TransferResponse.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace corvane {

/// How a task of the transfer agent ended: what its delegate is told, in a form that outlives the process. A value.
/// Internal.
struct TransferOutcome {
    /// The code of a `TransferError`, and its message.
    std::optional<std::int64_t> errorCode;
    std::string errorText;
    std::optional<TransferResponse> response;

    [[nodiscard]] static TransferOutcome of(const std::optional<AnyError>& error,
                                            std::optional<TransferResponse> response);
    [[nodiscard]] std::optional<AnyError> error() const;

    [[nodiscard]] std::string encoded() const;
    /// Throws `InvalidArgument` for bytes that are no outcome; what a later version has appended is left alone.
    [[nodiscard]] static TransferOutcome decode(std::string_view bytes);
    /// In place of one that cannot be decoded: a failure, so that its task is tried again.
    [[nodiscard]] static TransferOutcome unreadable();
};

}  // namespace corvane
