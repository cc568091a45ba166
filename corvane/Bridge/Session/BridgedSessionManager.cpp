#include <corvane/Bridge/Session/BridgedSessionManager.h>

#include <corvane/Bridge/Data/StackEntry.h>
#include <corvane/Bridge/Models/Refusal.h>
#include <corvane/Bridge/Session/BridgedEventProcessor.h>

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

std::optional<BridgedError> bridgedError(const AnyError* error) {
    return error ? std::optional(BridgedError::of(*error)) : std::nullopt;
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

void BridgedSessionManager::setRecording(bool isOn, std::function<void(const BridgedError*)> completion) {
    if (!completion) return sessionManager_->setRecording(isOn);
    sessionManager_->setRecording(isOn, [completion = std::move(completion)](const AnyError* error) {
        const auto bridged = bridgedError(error);
        completion(bridged ? &*bridged : nullptr);
    });
}

bool BridgedSessionManager::isRecording() const {
    return sessionManager_->isRecording();
}

void BridgedSessionManager::forget(std::function<void(const ForgottenRecords&, const BridgedError*)> completion) {
    if (!completion) return sessionManager_->forget();
    sessionManager_->forget(
        [completion = std::move(completion)](const ForgottenRecords& forgotten, const AnyError* error) {
            const auto bridged = bridgedError(error);
            completion(forgotten, bridged ? &*bridged : nullptr);
        });
}

bool BridgedSessionManager::pushSessionData(const BridgedSessionData& data, BridgedDataEventTraits traits,
                                            bool submitEventQueues, BridgedError* error) {
    return bridge::attempt("pushSessionData", error,
                           [&] { sessionManager_->push(bridge::sessionEntry(data, traits), submitEventQueues); });
}

std::uint64_t BridgedSessionManager::waitingCount() const {
    return sessionManager_->waitingCount();
}

void BridgedSessionManager::transaction(AccessBlock block) {
    if (!block) return;
    sessionManager_->transaction([block = std::move(block)](AccessSessionManager& access) {
        const auto bridged = std::make_shared<BridgedAccessSessionManager>(access);
        const Ending ending(*bridged);
        block(bridged);
    });
}

BridgedProcessorManager::BridgedProcessorManager(std::shared_ptr<ProcessorManager> processorManager)
    : processorManager_(bridge::present(std::move(processorManager), "the processor manager")) {}
BridgedProcessorManager::~BridgedProcessorManager() = default;

bool BridgedProcessorManager::addEventProcessor(const std::shared_ptr<BridgedEventProcessorType>& eventProcessor,
                                                BridgedError* error) {
    return bridge::attempt("addEventProcessor", error,
                           [&] { processorManager_->add(std::make_shared<BridgedEventProcessor>(eventProcessor)); });
}

void BridgedProcessorManager::removeEventProcessor(const std::shared_ptr<BridgedEventProcessorType>& eventProcessor) {
    if (eventProcessor) processorManager_->remove(std::make_shared<BridgedEventProcessor>(eventProcessor));
}

void BridgedProcessorManager::resumeBackgroundProcessingForIdentifier(std::string identifier,
                                                                      std::function<void()> completion) {
    processorManager_->resumeBackgroundProcessing(std::move(identifier), std::move(completion));
}

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
