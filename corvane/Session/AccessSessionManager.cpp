#include <corvane/Session/AccessSessionManager.h>

#include <corvane/Session/SessionCore.h>

#include <utility>

namespace corvane {

AccessSessionManager::AccessSessionManager(std::shared_ptr<SessionCore> sessionManager)
    : sessionManager_(std::move(sessionManager)) {}
AccessSessionManager::~AccessSessionManager() = default;

bool AccessSessionManager::isActive() const {
    return sessionManager_->isActive();
}

void AccessSessionManager::push(AnyDataEventEntry entry, bool submitEventQueues) {
    sessionManager_->push(std::move(entry), submitEventQueues);
}

}  // namespace corvane
