#include <corvane/Platform/TransferSession.h>

#include <corvane/Platform/BackgroundTransferSession.h>
#include <corvane/Platform/InProcessTransferSession.h>
#include <corvane/Platform/Log.h>

#include <mutex>
#include <utility>

namespace corvane {

namespace {
struct Registry {
    std::mutex mutex;
    std::shared_ptr<const TransferSession::Factory> factory;
};

Registry& registry() {
    static auto& instance = *new Registry;  // never destroyed: sessions may be opened while the process exits
    return instance;
}
}  // namespace

TransferTask::~TransferTask() = default;
TransferSessionDelegate::~TransferSessionDelegate() = default;
void TransferSessionDelegate::taskDidEndElsewhere(const TransferTask&, const std::optional<AnyError>&,
                                                  const std::optional<TransferResponse>&) {}
TransferSession::~TransferSession() = default;

void TransferSession::setFactory(Factory factory) {
    auto shared = factory ? std::make_shared<const Factory>(std::move(factory)) : nullptr;
    std::lock_guard lock(registry().mutex);
    registry().factory.swap(shared);  // the old one, and what it holds, goes behind the lock
}

std::shared_ptr<TransferSession> TransferSession::make(TransferSessionConfiguration configuration,
                                                       std::weak_ptr<TransferSessionDelegate> delegate,
                                                       std::shared_ptr<SerialQueue> queue) {
    std::shared_ptr<const Factory> factory;
    {
        std::lock_guard lock(registry().mutex);
        factory = registry().factory;
    }
    if (factory) return (*factory)(std::move(configuration), std::move(delegate), std::move(queue));
    if (BackgroundTransferSession::isAvailable()) {
        return std::make_shared<BackgroundTransferSession>(configuration, std::move(delegate), std::move(queue));
    }
    Log::shared().default_("Transfer agent is not installed, transfers run inside the process, session=%{public}@",
                           configuration.identifier);
    return std::make_shared<InProcessTransferSession>(configuration, std::move(delegate), std::move(queue));
}

}  // namespace corvane
