#include <corvane/Agent/Host/DefaultTransferSession.h>

#include <corvane/Agent/Host/BackgroundTransferSession.h>
#include <corvane/Platform/Log.h>
#include <corvane/Transfer/InProcessTransferSession.h>

#include <utility>

namespace corvane {

std::shared_ptr<TransferSession> makeDefaultTransferSession(TransferSessionConfiguration configuration,
                                                            std::weak_ptr<TransferSessionDelegate> delegate,
                                                            std::shared_ptr<SerialQueue> queue) {
    if (const auto factory = TransferSession::factory()) {
        return factory(std::move(configuration), std::move(delegate), std::move(queue));
    }
    if (BackgroundTransferSession::isAvailable()) {
        return std::make_shared<BackgroundTransferSession>(configuration, std::move(delegate), std::move(queue));
    }
    Log::shared().default_("Transfer agent is not installed, transfers run inside the process, session=%{public}@",
                           configuration.identifier);
    return std::make_shared<InProcessTransferSession>(configuration, std::move(delegate), std::move(queue));
}

}  // namespace corvane
