#include <corvane/Bridge/Session/BridgedSessionManager.h>

#include <corvane/Bridge/Data/StackEntry.h>
#include <corvane/Bridge/Models/Refusal.h>

#include <utility>

namespace corvane {

namespace {

Session::Kind libraryKind(BridgedSessionKind kind, const std::optional<std::string>& name) {
    switch (kind) {
        case BridgedSessionKind::userEvents:
            return Session::Kind::userEvents();
        case BridgedSessionKind::telemetry:
            return Session::Kind::telemetry();
        case BridgedSessionKind::realtime:
            return Session::Kind::realtime();
        case BridgedSessionKind::custom:
            bridge::requireUTF8(name.value_or(""), "the name of the session's kind");
            return Session::Kind::custom(name.value_or(""));
    }
    throw BridgeError(BridgeError::unknownValue, "the session's kind");
}

/// Takes the handle away from whoever kept it, also when the block throws.
class Ending {
  public:
    explicit Ending(BridgedAccessSessionManager& access) : access_(access) {}
    Ending(const Ending&) = delete;
    Ending& operator=(const Ending&) = delete;
    ~Ending() { access_.end(); }

  private:
    BridgedAccessSessionManager& access_;
};

}  // namespace

BridgedSessionManager::BridgedSessionManager() : BridgedSessionManager(std::make_shared<SessionManager>()) {}

BridgedSessionManager::BridgedSessionManager(std::shared_ptr<SessionManager> sessionManager)
    : sessionManager_(bridge::present(std::move(sessionManager), "the session manager")),
      tracker_(std::make_shared<BridgedTracker>(sessionManager_->tracker())),
      processorManager_(std::make_shared<BridgedProcessorManager>(sessionManager_->processorManager())) {}
BridgedSessionManager::~BridgedSessionManager() = default;

bool BridgedSessionManager::startSessionForKind(BridgedSessionKind kind, const std::optional<std::string>& name,
                                                BridgedError* error) {
    return bridge::attempt("startSessionForKind", error, [&] { sessionManager_->start(libraryKind(kind, name)); });
}

void BridgedSessionManager::endSession() {
    sessionManager_->end();
}
void BridgedSessionManager::endSessionWithCompletion(std::function<void()> completion) {
    sessionManager_->end(std::move(completion));
}

bool BridgedSessionManager::pushSessionData(const BridgedSessionData& data, BridgedDataEventTraits traits,
                                            bool submitEventQueues, BridgedError* error) {
    return bridge::attempt("pushSessionData", error,
                           [&] { sessionManager_->push(bridge::sessionEntry(data, traits), submitEventQueues); });
}

void BridgedSessionManager::transaction(AccessBlock block) {
    if (!block) return;
    sessionManager_->transaction([block = std::move(block)](AccessSessionManager& access) {
        const auto bridged = std::make_shared<BridgedAccessSessionManager>(access);
        const Ending ending(*bridged);
        block(bridged);
    });
}

}  // namespace corvane
