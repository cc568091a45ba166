#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Processing/EventProcessorType.h>

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace corvane {

/// Reports the session that runs. Called on the access queue.
class CORVANE_EXPORT SessionProviderType {
  public:
    virtual ~SessionProviderType() = default;
    [[nodiscard]] virtual std::optional<Session> currentSession() const = 0;
};

/// Keeps the processors of a session manager, and hands them every event and change in the order of registration.
///
/// Made and owned by the session manager; shared with the host. `add`, `remove` and `resumeBackgroundProcessing` may be
/// called from any thread and return at once; the deliveries are the session manager's, on the access queue.
class CORVANE_EXPORT ProcessorManager : public std::enable_shared_from_this<ProcessorManager> {
  public:
    explicit ProcessorManager(std::shared_ptr<SerialQueue> accessQueue);
    ProcessorManager(const ProcessorManager&) = delete;
    ProcessorManager& operator=(const ProcessorManager&) = delete;
    ~ProcessorManager();

    /// Adds a processor at the end; one that is added twice is called twice. It learns of a running session as if that
    /// had just started. `registerAccessQueue` is called before this returns, and what it throws reaches the caller.
    /// Throws `InvalidArgument` for a null pointer.
    void add(std::shared_ptr<EventProcessorType> eventProcessor);
    /// Removes every entry of the processor's `identity`, which gets no further callback and no notice.
    void remove(std::shared_ptr<EventProcessorType> eventProcessor);
    /// Hands on that the platform woke the application for a background transfer session. Every processor is asked; a
    /// request that none takes is kept, one at a time, and offered to each processor added later.
    void resumeBackgroundProcessing(std::string identifier, std::function<void()> completion);

    /// Set once by the session manager, before the first task. Held weakly.
    void setSessionProvider(std::weak_ptr<SessionProviderType> sessionProvider);

    // Deliveries. Require: the access queue.
    void process(const ProcessEvent& processEvent);
    void didEnterGroup(const Group& group);
    void didLeaveGroup(const Group& group);
    void didStartSession(const Session& session);
    void didUpdateSession(const Session& session, bool submitQueues);
    void didEndSession(const Session& session, Date endDate);
    void didReject(const RejectedEvent& event);
    /// Returns the sum of what the processors say.
    ForgottenRecords forget();

  private:
    struct DeferredBackgroundResuming {
        std::string identifier;
        std::function<void()> completion;
    };

    template <class Call>
    void deliver(const char* operation, Call call);
    void append(const std::shared_ptr<EventProcessorType>& eventProcessor);
    void resume(std::string identifier, std::function<void()> completion);

    const std::shared_ptr<SerialQueue> accessQueue_;
    std::weak_ptr<SessionProviderType> sessionProvider_;

    std::vector<std::shared_ptr<EventProcessorType>> eventProcessors_ CORVANE_GUARDED_BY(*accessQueue_);
    std::optional<DeferredBackgroundResuming> deferredBackgroundResuming_ CORVANE_GUARDED_BY(*accessQueue_);
};

}  // namespace corvane
