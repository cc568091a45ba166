#pragma once

#include <corvane/Export.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Processing/EventProcessorType.h>

#include <functional>
#include <memory>
#include <string>

namespace corvane {

class SerialQueue;

/// Hands everything that it is told to another processor. What changes one thing about a processor derives from it,
/// overrides that callback, and leaves the rest to the wrapped one: session starts above all, with which a processor
/// takes up what earlier runs left.
///
/// It is added in place of the processor that it wraps, and has its identity: removing either removes both. Wrappers
/// may be stacked. Each belongs to the first session manager that it is added to, so that what derives from it may
/// keep state on that manager's queue. It shares the wrapped processor, which the host may keep too.
///
///     class OnlyInGroups final : public ForwardingEventProcessor {
///         using ForwardingEventProcessor::ForwardingEventProcessor;
///         void process(const ProcessEvent& event) override {
///             if (event.groupName()) ForwardingEventProcessor::process(event);
///         }
///     };
class CORVANE_EXPORT ForwardingEventProcessor : public EventProcessorType {
  public:
    /// Throws `InvalidArgument` for a null pointer.
    explicit ForwardingEventProcessor(std::shared_ptr<EventProcessorType> eventProcessor);
    ForwardingEventProcessor(const ForwardingEventProcessor&) = delete;
    ForwardingEventProcessor& operator=(const ForwardingEventProcessor&) = delete;
    ~ForwardingEventProcessor() override;

    /// The wrapped processor.
    [[nodiscard]] const std::shared_ptr<EventProcessorType>& eventProcessor() const { return eventProcessor_; }

    /// Throws `InvalidArgument` when the processor was added to another session manager before, and what the wrapped
    /// one throws, after which it belongs to no manager yet.
    void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) override;
    // What the wrapped processor throws in a callback goes on to the caller.
    void process(const ProcessEvent& processEvent) override;
    void didEnterGroup(const Group& group) override;
    void didLeaveGroup(const Group& group) override;
    void didStartSession(const Session& session) override;
    void didUpdateSession(const Session& session, bool submitQueues) override;
    void didEndSession(const Session& session, Date endDate) override;
    void didReject(const RejectedEvent& event) override;
    ForgottenRecords forget() override;
    /// The wrapped processor's.
    [[nodiscard]] const void* identity() const override;
    bool resumeBackgroundProcessing(const std::string& identifier, const std::function<void()>& completion) override;

  private:
    /// Returns whether the processor belonged to nobody before. Throws `InvalidArgument` when it is another one's.
    bool claim(const std::shared_ptr<SerialQueue>& accessQueue);

    const std::shared_ptr<EventProcessorType> eventProcessor_;
    Mutex registrationMutex_;  // never held while the wrapped processor is called
    std::shared_ptr<SerialQueue> accessQueue_ CORVANE_GUARDED_BY(registrationMutex_);
};

}  // namespace corvane
