#include <corvane/Bridge/Session/BridgedAccessSessionManager.h>

#include <corvane/Bridge/Data/StackEntry.h>
#include <corvane/Bridge/Models/Refusal.h>

namespace corvane {

BridgedAccessSessionManager::BridgedAccessSessionManager(AccessSessionManager& accessSessionManager)
    : thread_(std::this_thread::get_id()), accessSessionManager_(&accessSessionManager) {}

AccessSessionManager* BridgedAccessSessionManager::usable() const {
    return std::this_thread::get_id() == thread_ ? accessSessionManager_ : nullptr;
}

bool BridgedAccessSessionManager::isActive() const {
    const auto* manager = usable();
    return manager && manager->isActive();
}

bool BridgedAccessSessionManager::pushSessionData(const BridgedSessionData& data, BridgedDataEventTraits traits,
                                                  bool submitEventQueues, BridgedError* error) const {
    return bridge::attempt("pushSessionData", error, [&] {
        auto* manager = usable();
        if (!manager) throw BridgeError(BridgeError::wrongQueue, "the session manager's handle");
        manager->push(bridge::sessionEntry(data, traits), submitEventQueues);
    });
}

}  // namespace corvane
