#include <corvane/Bridge/Session/BridgingFilteringEventProcessor.h>

#include <corvane/Bridge/Models/BridgedError.h>
#include <corvane/Bridge/Session/BridgedEventProcessor.h>

#include <utility>

namespace corvane {

namespace {

FilteringEventProcessor::Filter libraryFilter(BridgingFilteringEventProcessor::Filter filter) {
    if (!filter) throw BridgeError(BridgeError::missingObject, "the filter");
    return [filter = std::move(filter)](const ProcessEvent& event) -> std::optional<ProcessEvent> {
        const auto answer = filter(BridgedProcessEvent(event));
        if (!answer) return std::nullopt;
        return answer->processEvent();
    };
}

}  // namespace

BridgingFilteringEventProcessor::BridgingFilteringEventProcessor(
    std::shared_ptr<BridgedEventProcessorType> eventProcessor, Filter filter)
    : BridgingFilteringEventProcessor(std::make_shared<FilteringEventProcessor>(
          std::make_shared<BridgedEventProcessor>(std::move(eventProcessor)), libraryFilter(std::move(filter)))) {}
BridgingFilteringEventProcessor::BridgingFilteringEventProcessor(
    std::shared_ptr<FilteringEventProcessor> eventProcessor)
    : BridgingEventProcessor(eventProcessor), proxyEventProcessor_(std::move(eventProcessor)) {}
BridgingFilteringEventProcessor::~BridgingFilteringEventProcessor() = default;

}  // namespace corvane
