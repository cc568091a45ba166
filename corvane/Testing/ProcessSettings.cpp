#include <corvane/Testing/ProcessSettings.h>

#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Log.h>
#include <corvane/Transfer/InProcessTransferSession.h>

namespace corvane::test {

void ProcessSettings::restore() {
    TransferSession::setFactory(InProcessTransferSession::factory());
    SigningServiceType::setShared(nullptr);
    MainQueue::setExecutor(nullptr);
}

void ProcessSettings::restoreAll() {
    restore();
    DocumentsDirectory::set({});
    Log::shared().setSink(nullptr);
    Log::shared().setLevel(LogLevel::error);
    Log::shared().setHidesPrivateArguments(false);
}

}  // namespace corvane::test
