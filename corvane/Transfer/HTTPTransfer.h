#pragma once

#include <corvane/Transfer/TransferOutcome.h>
#include <corvane/Transfer/TransferProxy.h>
#include <corvane/Transfer/TransferRequest.h>
#include <corvane/Transfer/TransferSessionConfiguration.h>

#include <cstdint>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>

namespace corvane {

/// One HTTP exchange as it is handed to the transfer thread. A value; what it calls, it calls on that thread, so the
/// functions only enqueue.
struct HTTPTransfer {
    TransferRequest request;
    /// Sent as the body, when there is one.
    std::optional<std::filesystem::path> bodyPath;
    /// Whether the body is sent only from a file of the process's own user that is no symbolic link.
    bool bodyMustBeOwn = false;
    TransferLimits limits;
    TransferProxy proxy;
    /// As in `TransferSessionConfiguration`; empty for the system's certificates.
    std::filesystem::path trustedCertificates;
    /// Transfers of one pool share the limit per host; see `TransferQueue`.
    std::string pool;
    /// The bytes of the body that have gone out so far and its size, whenever the first has grown. May be empty.
    std::function<void(std::int64_t total, std::int64_t expected)> didSend;
    /// The end; called once, unless the process exits before.
    std::function<void(TransferOutcome outcome)> didComplete;
};

}  // namespace corvane
