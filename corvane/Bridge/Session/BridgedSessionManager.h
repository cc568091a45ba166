#pragma once

#include <corvane/Bridge/Data/BridgedTracker.h>
#include <corvane/Bridge/Session/BridgedAccessSessionManager.h>
#include <corvane/Bridge/Session/BridgedProcessorManager.h>
#include <corvane/Bridge/Session/BridgedSessionKind.h>
#include <corvane/Export.h>
#include <corvane/Session/SessionManager.h>

#include <functional>
#include <memory>
#include <optional>
#include <string>

namespace corvane {

/// The session manager for object-facing hosts. Callers see it as `CVSessionManager`.
///
/// A host makes its own, or wraps the one that it uses already, so that plug-ins record with its session. The members
/// may be called from any thread, enqueue their work and return at once; those that return a Boolean return false when
/// they refuse their arguments, log why, and fill `error` unless that is nullptr. Releasing the last reference on the
/// library's session manager ends it as its destructor says; what came out of it stays safe to call.
///
///     CVSessionManager sessions;
///     sessions.processorManager()->addEventProcessor(std::make_shared<CVLoggingEventProcessor>());
///     sessions.startSessionForKind(CVSessionKind::userEvents);
class CORVANE_EXPORT BridgedSessionManager {
  public:
    using AccessBlock = std::function<void(const std::shared_ptr<BridgedAccessSessionManager>&)>;

    BridgedSessionManager();
    /// Throws `BridgeError::missingObject` without a manager.
    explicit BridgedSessionManager(std::shared_ptr<SessionManager> sessionManager);
    BridgedSessionManager(const BridgedSessionManager&) = delete;
    BridgedSessionManager& operator=(const BridgedSessionManager&) = delete;
    ~BridgedSessionManager();

    /// The root tracker.
    [[nodiscard]] const std::shared_ptr<BridgedTracker>& tracker() const { return tracker_; }
    [[nodiscard]] const std::shared_ptr<BridgedProcessorManager>& processorManager() const { return processorManager_; }
    /// The library's own manager.
    [[nodiscard]] const std::shared_ptr<SessionManager>& sessionManager() const { return sessionManager_; }

    /// Starts a session. The name is that of a custom kind, empty if absent; the other kinds ignore it. Refuses an
    /// integer that is no kind and a name that is not UTF-8.
    bool startSessionForKind(BridgedSessionKind kind, const std::optional<std::string>& name = std::nullopt,
                             BridgedError* error = nullptr);
    void endSession();
    /// The completion, if any, is called on the queue, also when there was nothing to end.
    void endSessionWithCompletion(std::function<void()> completion);

    /// Puts data into this and later sessions, under its key. It is converted before the call returns, on the caller's
    /// thread. Refused, with no effect: a missing object, a name or key that is not UTF-8, data that cannot become
    /// JSON. Data events of one class share a stack, of which a session carries the newest.
    bool pushSessionData(const BridgedSessionData& data, BridgedDataEventTraits traits = {},
                         bool submitEventQueues = false, BridgedError* error = nullptr);
    /// Runs a block on the queue. What it throws is logged.
    void transaction(AccessBlock block);

  private:
    const std::shared_ptr<SessionManager> sessionManager_;
    const std::shared_ptr<BridgedTracker> tracker_;
    const std::shared_ptr<BridgedProcessorManager> processorManager_;
};

}  // namespace corvane
