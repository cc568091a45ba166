#pragma once

#include <corvane/Platform/MainQueue.h>
#include <corvane/Signing/SigningServiceType.h>
#include <corvane/Transfer/TransferSession.h>

#include <memory>
#include <utility>

namespace corvane::test {

/// What a test sets for the whole process. The destructor leaves everything as test programs have it: transfers inside
/// the process, so that no test leaves a transfer agent behind, and the library's own for the rest. Objects that are
/// open keep what they found. One at a time in a process; any thread.
///
/// Declare it behind what the settings refer to.
///
///     ProcessSettings settings;
///     settings.setSigning(std::make_shared<NoHardware>());
class ProcessSettings {
  public:
    ProcessSettings() = default;
    ProcessSettings(const ProcessSettings&) = delete;
    ProcessSettings& operator=(const ProcessSettings&) = delete;
    ~ProcessSettings() { restore(); }

    /// As `TransferSession::setFactory`.
    void setTransfers(TransferSession::Factory factory) { TransferSession::setFactory(std::move(factory)); }
    /// As `SigningServiceType::setShared`.
    void setSigning(std::shared_ptr<SigningServiceType> service) { SigningServiceType::setShared(std::move(service)); }
    /// As `MainQueue::setExecutor`.
    void setMainQueue(MainQueue::Executor executor) { MainQueue::setExecutor(std::move(executor)); }

    /// The same for what `TemporaryDocuments` and `CapturedLog` set too. A test program that calls it before every test
    /// has each begin alike, whatever the one before did.
    static void restoreAll();

  private:
    static void restore();
};

}  // namespace corvane::test
