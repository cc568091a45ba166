#include <corvane/Bridge/Session/BridgingSamplingEventProcessor.h>

#include <corvane/Bridge/Session/BridgedEventProcessor.h>

#include <utility>

namespace corvane {

BridgingSamplingEventProcessor::BridgingSamplingEventProcessor(
    std::shared_ptr<BridgedEventProcessorType> eventProcessor, int keepOneIn)
    : BridgingSamplingEventProcessor(std::make_shared<SamplingEventProcessor>(
          std::make_shared<BridgedEventProcessor>(std::move(eventProcessor)), keepOneIn)) {}
BridgingSamplingEventProcessor::BridgingSamplingEventProcessor(std::shared_ptr<SamplingEventProcessor> eventProcessor)
    : BridgingEventProcessor(eventProcessor), proxyEventProcessor_(std::move(eventProcessor)) {}
BridgingSamplingEventProcessor::~BridgingSamplingEventProcessor() = default;

}  // namespace corvane
