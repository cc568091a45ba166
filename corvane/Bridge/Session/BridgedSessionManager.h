#pragma once

#include <corvane/Bridge/Data/BridgedTracker.h>
#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Bridge/Models/BridgedError.h>
#include <corvane/Bridge/Models/BridgedSession.h>
#include <corvane/Bridge/Session/BridgedEventProcessorType.h>
#include <corvane/Export.h>
#include <corvane/Platform/ForgottenRecords.h>
#include <corvane/Processing/ProcessorManager.h>
#include <corvane/Session/AccessSessionManager.h>
#include <corvane/Session/SessionManager.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <thread>

namespace corvane {

/// Where a host adds and removes its processors. Callers see it as `CVProcessorManager`. Shared by the host; all
/// members may be called from any thread and return at once.
class CORVANE_EXPORT BridgedProcessorManager {
  public:
    /// Throws `BridgeError::missingObject` without a manager.
    explicit BridgedProcessorManager(std::shared_ptr<ProcessorManager> processorManager);
    ~BridgedProcessorManager();

    /// Adds a processor at the end. Refuses, with false and `error` filled, a missing one and one whose
    /// `registerAccessQueue` throws.
    bool addEventProcessor(const std::shared_ptr<BridgedEventProcessorType>& eventProcessor,
                           BridgedError* error = nullptr);
    /// Removes every entry of a processor, which gets no further callback; nothing if it was never added.
    void removeEventProcessor(const std::shared_ptr<BridgedEventProcessorType>& eventProcessor);
    /// Hands on that the platform woke the application for a background transfer session.
    void resumeBackgroundProcessingForIdentifier(std::string identifier, std::function<void()> completion);

    /// The library's own manager.
    [[nodiscard]] const std::shared_ptr<ProcessorManager>& processorManager() const { return processorManager_; }

  private:
    const std::shared_ptr<ProcessorManager> processorManager_;
};

/// A handle on the session manager for the length of a transaction block. Callers see it as `CVAccessSessionManager`.
/// Its members run inline. One that is kept is of no further use: after the block, and off the block's thread, it is
/// not active and refuses pushes with `BridgeError::wrongQueue`.
class CORVANE_EXPORT BridgedAccessSessionManager {
  public:
    explicit BridgedAccessSessionManager(AccessSessionManager& accessSessionManager);
    BridgedAccessSessionManager(const BridgedAccessSessionManager&) = delete;
    BridgedAccessSessionManager& operator=(const BridgedAccessSessionManager&) = delete;
    ~BridgedAccessSessionManager() = default;

    [[nodiscard]] bool isActive() const;

    /// As `BridgedSessionManager::pushSessionData`, done when it returns.
    bool pushSessionData(const BridgedSessionData& data, BridgedDataEventTraits traits = {},
                         bool submitEventQueues = false, BridgedError* error = nullptr) const;

    /// The block is over. On the block's thread.
    void end() { accessSessionManager_ = nullptr; }

  private:
    /// The library's handle, or nullptr where it must not be used.
    [[nodiscard]] AccessSessionManager* usable() const;

    const std::thread::id thread_;
    AccessSessionManager* accessSessionManager_;  // read and changed on the block's thread alone
};

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

    /// As `SessionManager::setRecording`. The completion, if any, gets nullptr or the reason why the choice could not
    /// be written.
    void setRecording(bool isOn, std::function<void(const BridgedError*)> completion = {});
    [[nodiscard]] bool isRecording() const;
    /// As `SessionManager::forget`. The completion, if any, gets how much was dropped, and nullptr or the reason why
    /// something may be left.
    void forget(std::function<void(const ForgottenRecords&, const BridgedError*)> completion = {});

    /// Puts data into this and later sessions, under its key. It is converted before the call returns, on the caller's
    /// thread. Refused, with no effect: a missing object, a name or key that is not UTF-8, data that cannot become
    /// JSON. Data events of one class share a stack, of which a session carries the newest.
    bool pushSessionData(const BridgedSessionData& data, BridgedDataEventTraits traits = {},
                         bool submitEventQueues = false, BridgedError* error = nullptr);
    /// How many calls wait in memory: see `SessionManager::waitingCount`. Any thread.
    [[nodiscard]] std::uint64_t waitingCount() const;
    /// Runs a block on the queue. What it throws is logged.
    void transaction(AccessBlock block);

  private:
    const std::shared_ptr<SessionManager> sessionManager_;
    const std::shared_ptr<BridgedTracker> tracker_;
    const std::shared_ptr<BridgedProcessorManager> processorManager_;
};

}  // namespace corvane
