#pragma once

// Internal.

#include <corvane/Bridge/Session/BridgedEventProcessorType.h>
#include <corvane/Bridge/Upload/BridgedUploadBatchEventProcessor.h>
#include <corvane/c/Callback.h>
#include <corvane/c/Objects.h>
#include <corvane/c/corvane.h>

#include <atomic>
#include <functional>
#include <memory>
#include <string>
#include <utility>

namespace corvane::c {

/// A processor, the library's or the host's.
class ProcessorObject final : public Object {
  public:
    static constexpr Kind kind = Kind::processor;

    explicit ProcessorObject(std::shared_ptr<BridgedEventProcessorType> given) : processor(std::move(given)) {}

    /// The batching processor. Throws when it is another one.
    [[nodiscard]] BridgedUploadBatchEventProcessor& uploads() const;

    const std::shared_ptr<BridgedEventProcessorType> processor;
};

/// Hands every callback to a processor of the host's.
class Processor final : public BridgedEventProcessorType {
  public:
    Processor(const corvane_processor_callbacks& callbacks, Context context)
        : callbacks_(callbacks), context_(std::move(context)) {}

    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {}
    void processEvent(const BridgedProcessEvent& event) override;
    void didEnterGroup(const Group& group) override;
    void didLeaveGroup(const Group& group) override;
    void didStartSession(const BridgedSession& session) override;
    void didUpdateSession(const BridgedSession& session, bool submitEventQueues) override;
    void didEndSession(const BridgedSession& session, Date endDate) override;
    void didReject(const RejectedEvent& event) override;
    ForgottenRecords forget() override;
    bool resumeBackgroundProcessingForIdentifier(const std::string& identifier,
                                                 const std::function<void()>& completion) override;

  private:
    template <class R, class... A, class... B>
    R tell(R (*function)(void*, A...), B&&... arguments) const {
        return Callback<R(void*, A...)>(function, context_)(std::forward<B>(arguments)...);
    }

    const corvane_processor_callbacks callbacks_;
    const Context context_;
};

/// What a callback writes text into.
class Text final : public Object {
  public:
    static constexpr Kind kind = Kind::text;

    explicit Text(std::string* written) : text(written) {}

    std::string* const text;  // good for the length of the callback
    std::atomic<bool> isSet = false;
};

/// Something to do once.
class TaskObject final : public Object {
  public:
    static constexpr Kind kind = Kind::task;

    explicit TaskObject(std::function<void()> given) : task(std::move(given)) {}

    const std::function<void()> task;
    std::atomic<bool> isDone = false;
};

}  // namespace corvane::c
