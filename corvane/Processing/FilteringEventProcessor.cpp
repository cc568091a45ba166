#include <corvane/Processing/FilteringEventProcessor.h>

#include <corvane/Platform/HostCall.h>

#include <utility>

namespace corvane {

namespace {

bool isSame(const ProcessEvent& left, const ProcessEvent& right) {
    return left.name() == right.name() && left.groupName() == right.groupName() &&
           left.json().text() == right.json().text();
}

void count(std::atomic<std::uint64_t>& events) {
    events.fetch_add(1, std::memory_order_relaxed);
}

}  // namespace

FilteringEventProcessor::FilteringEventProcessor(std::shared_ptr<EventProcessorType> eventProcessor, Filter filter)
    : ForwardingEventProcessor(std::move(eventProcessor)), filter_(std::move(filter)) {
    if (!filter_) throw InvalidArgument("there is no filter for the events");
}
FilteringEventProcessor::~FilteringEventProcessor() = default;

void FilteringEventProcessor::process(const ProcessEvent& processEvent) {
    const auto event = filtered(processEvent);
    if (!event) return count(droppedEvents_);
    ForwardingEventProcessor::process(*event);
}

std::optional<ProcessEvent> FilteringEventProcessor::filtered(const ProcessEvent& processEvent) {
    std::optional<ProcessEvent> event;
    bool isDecided = false;
    callHost("event filter", [&] {
        auto answer = filter_(processEvent);
        if (answer && !isSame(*answer, processEvent)) {
            (void)answer->payload();  // throws what is wrong with it here, where it can still be counted
            count(rewrittenEvents_);
        }
        event = std::move(answer);
        isDecided = true;
    });
    if (!isDecided) count(failures_);
    return event;
}

}  // namespace corvane
