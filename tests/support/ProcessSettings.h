#pragma once

#include <corvane/Platform/MainQueue.h>
#include <corvane/Signing/SigningServiceType.h>
#include <corvane/Transfer/TransferSession.h>

#include <chrono>
#include <memory>
#include <utility>

namespace corvane::test {

/// What a test sets for the whole process. At its end everything is as test programs have it: transfers inside the
/// process, so that no test leaves a transfer agent behind, and the library's own for the rest. Every test begins so,
/// whatever the one before it did.
///
/// Declare it behind what the settings refer to.
class ProcessSettings {
  public:
    ProcessSettings() = default;
    ProcessSettings(const ProcessSettings&) = delete;
    ProcessSettings& operator=(const ProcessSettings&) = delete;
    ~ProcessSettings() { restore(); }

    void setTransfers(TransferSession::Factory factory) { TransferSession::setFactory(std::move(factory)); }
    void setSigning(std::shared_ptr<SigningServiceType> service) { SigningServiceType::setShared(std::move(service)); }
    void setMainQueue(MainQueue::Executor executor) { MainQueue::setExecutor(std::move(executor)); }
    void setBusyTimeout(std::chrono::milliseconds timeout);

    /// Also what `TemporaryDocuments` and `CapturedLog` set.
    static void restoreAll();

  private:
    static void restore();
};

}  // namespace corvane::test
