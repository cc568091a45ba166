#include "tests/support/ProcessSettings.h"

#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Log.h>
#include <corvane/Store/StoreConnection.h>
#include <corvane/Transfer/InProcessTransferSession.h>

namespace corvane::test {

void ProcessSettings::setBusyTimeout(std::chrono::milliseconds timeout) {
    StoreConnection::setBusyTimeout(timeout);
}

void ProcessSettings::restore() {
    TransferSession::setFactory(InProcessTransferSession::factory());
    SigningServiceType::setShared(nullptr);
    MainQueue::setExecutor(nullptr);
    StoreConnection::setBusyTimeout(std::chrono::seconds(5));
}

void ProcessSettings::restoreAll() {
    restore();
    DocumentsDirectory::set({});
    Log::shared().setSink(nullptr);
    Log::shared().setLevel(LogLevel::error);
    Log::shared().setHidesPrivateArguments(false);
}

}  // namespace corvane::test
