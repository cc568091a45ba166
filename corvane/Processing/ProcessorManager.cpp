#include <corvane/Processing/ProcessorManager.h>

#include <corvane/Platform/HostCall.h>

#include <utility>

namespace corvane {

ProcessorManager::ProcessorManager(std::shared_ptr<SerialQueue> accessQueue) : accessQueue_(std::move(accessQueue)) {}
ProcessorManager::~ProcessorManager() = default;

void ProcessorManager::setSessionProvider(std::weak_ptr<SessionProviderType> sessionProvider) {
    sessionProvider_ = std::move(sessionProvider);
}

void ProcessorManager::add(std::shared_ptr<EventProcessorType> eventProcessor) {
    if (!eventProcessor) throw InvalidArgument("there is no event processor to add");
    eventProcessor->registerAccessQueue(accessQueue_);
    accessQueue_->async(
        [self = shared_from_this(), eventProcessor = std::move(eventProcessor)] { self->append(eventProcessor); });
}

void ProcessorManager::append(const std::shared_ptr<EventProcessorType>& eventProcessor) {
    accessQueue_->assertCurrent("ProcessorManager add");
    eventProcessors_.push_back(eventProcessor);
    if (const auto provider = sessionProvider_.lock()) {
        if (const auto session = provider->currentSession()) {
            callHost("didStartSession", [&] { eventProcessor->didStartSession(*session); });
        }
    }
    if (!deferredBackgroundResuming_) return;
    const DeferredBackgroundResuming& held = *deferredBackgroundResuming_;
    bool taken = false;
    callHost("resumeBackgroundProcessing",
             [&] { taken = eventProcessor->resumeBackgroundProcessing(held.identifier, held.completion); });
    if (taken) deferredBackgroundResuming_.reset();
}

void ProcessorManager::remove(std::shared_ptr<EventProcessorType> eventProcessor) {
    if (!eventProcessor) return;
    accessQueue_->async([self = shared_from_this(), eventProcessor = std::move(eventProcessor)] {
        self->accessQueue_->assertCurrent("ProcessorManager remove");
        std::erase_if(self->eventProcessors_,
                      [&](const auto& added) { return added->identity() == eventProcessor->identity(); });
    });
}

void ProcessorManager::resumeBackgroundProcessing(std::string identifier, std::function<void()> completion) {
    accessQueue_->async(
        [self = shared_from_this(), identifier = std::move(identifier), completion = std::move(completion)]() mutable {
            self->resume(std::move(identifier), std::move(completion));
        });
}

void ProcessorManager::resume(std::string identifier, std::function<void()> completion) {
    accessQueue_->assertCurrent("ProcessorManager resumeBackgroundProcessing");
    bool handled = false;
    for (const auto& processor : eventProcessors_) {
        callHost("resumeBackgroundProcessing",
                 [&] { handled = processor->resumeBackgroundProcessing(identifier, completion) || handled; });
    }
    if (handled) {
        Log::shared().default_("Event processor handled background resuming for identifier=%@", identifier);
        return;
    }
    Log::shared().default_(
        "No event processors handled background resuming for identifier=%@. Deferring background resuming", identifier);
    deferredBackgroundResuming_ = DeferredBackgroundResuming{std::move(identifier), std::move(completion)};
}

template <class Call>
void ProcessorManager::deliver(const char* operation, Call call) {
    accessQueue_->assertCurrent(operation);
    for (const auto& processor : eventProcessors_) callHost(operation, [&] { call(*processor); });
}

void ProcessorManager::process(const ProcessEvent& processEvent) {
    deliver("process", [&](EventProcessorType& processor) { processor.process(processEvent); });
}

void ProcessorManager::didEnterGroup(const Group& group) {
    deliver("didEnterGroup", [&](EventProcessorType& processor) { processor.didEnterGroup(group); });
}

void ProcessorManager::didLeaveGroup(const Group& group) {
    deliver("didLeaveGroup", [&](EventProcessorType& processor) { processor.didLeaveGroup(group); });
}

void ProcessorManager::didStartSession(const Session& session) {
    deliver("didStartSession", [&](EventProcessorType& processor) { processor.didStartSession(session); });
}

void ProcessorManager::didUpdateSession(const Session& session, bool submitQueues) {
    deliver("didUpdateSession",
            [&](EventProcessorType& processor) { processor.didUpdateSession(session, submitQueues); });
}

void ProcessorManager::didReject(const RejectedEvent& event) {
    deliver("didReject", [&](EventProcessorType& processor) { processor.didReject(event); });
}

ForgottenRecords ProcessorManager::forget() {
    ForgottenRecords forgotten;
    deliver("forget", [&](EventProcessorType& processor) {
        const auto more = processor.forget();
        forgotten.events += more.events;
        forgotten.documents += more.documents;
    });
    return forgotten;
}

void ProcessorManager::didEndSession(const Session& session, Date endDate) {
    deliver("didEndSession", [&](EventProcessorType& processor) { processor.didEndSession(session, endDate); });
}

}  // namespace corvane
