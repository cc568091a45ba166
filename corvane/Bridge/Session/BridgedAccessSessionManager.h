#pragma once

#include <corvane/Bridge/Data/BridgedDataEventTraits.h>
#include <corvane/Bridge/Models/BridgedError.h>
#include <corvane/Bridge/Models/BridgedSessionData.h>
#include <corvane/Export.h>
#include <corvane/Session/AccessSessionManager.h>

#include <thread>

namespace corvane {

/// A handle on the session manager for the length of a transaction block. Callers see it as `CVAccessSessionManager`.
/// Its members run inline. One that is kept is of no further use: after the block, and off the block's thread, it is
/// not active and refuses pushes with `BridgeError::wrongQueue`.
class CORVANE_EXPORT BridgedAccessSessionManager {
  public:
    explicit BridgedAccessSessionManager(AccessSessionManager& accessSessionManager);
    BridgedAccessSessionManager(const BridgedAccessSessionManager&) = delete;
    BridgedAccessSessionManager& operator=(const BridgedAccessSessionManager&) = delete;
    ~BridgedAccessSessionManager() = default;

    [[nodiscard]] bool isActive() const;

    /// As `BridgedSessionManager::pushSessionData`, done when it returns.
    bool pushSessionData(const BridgedSessionData& data, BridgedDataEventTraits traits = {},
                         bool submitEventQueues = false, BridgedError* error = nullptr) const;

    /// The block is over. On the block's thread.
    void end() { accessSessionManager_ = nullptr; }

  private:
    /// The library's handle, or nullptr where it must not be used.
    [[nodiscard]] AccessSessionManager* usable() const;

    const std::thread::id thread_;
    AccessSessionManager* accessSessionManager_;  // read and changed on the block's thread alone
};

}  // namespace corvane
