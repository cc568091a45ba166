#pragma once

#include <corvane/Transfer/TransferSession.h>

#include <memory>

namespace corvane {

/// Opens a session through the process's factory (`TransferSession::setFactory`). Without one: a background session
/// with the default options where the transfer agent is there, and a session inside the process otherwise. Throws what
/// the factory throws. Any thread.
[[nodiscard]] std::shared_ptr<TransferSession> makeDefaultTransferSession(
    TransferSessionConfiguration configuration, std::weak_ptr<TransferSessionDelegate> delegate,
    std::shared_ptr<SerialQueue> queue);

}  // namespace corvane
