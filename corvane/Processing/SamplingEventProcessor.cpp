#include <corvane/Processing/SamplingEventProcessor.h>

#include <corvane/Platform/Error.h>

#include <utility>

#include <zlib.h>

namespace corvane {

SamplingEventProcessor::SamplingEventProcessor(std::shared_ptr<EventProcessorType> eventProcessor, int keepOneIn)
    : ForwardingEventProcessor(std::move(eventProcessor)), keepOneIn_(keepOneIn) {
    (void)keeps({}, keepOneIn);
}
SamplingEventProcessor::~SamplingEventProcessor() = default;

// Collectors weight by it: what is kept may not change.
bool SamplingEventProcessor::keeps(std::string_view sessionIdentifier, int keepOneIn) {
    if (keepOneIn < 1) throw InvalidArgument("sampling keeps one session in 1 or more");
    const auto* bytes = reinterpret_cast<const Bytef*>(sessionIdentifier.data());
    return crc32_z(0, bytes, sessionIdentifier.size()) % static_cast<unsigned>(keepOneIn) == 0;
}

void SamplingEventProcessor::process(const ProcessEvent& processEvent) {
    if (isKept_) return ForwardingEventProcessor::process(processEvent);
    droppedEvents_.fetch_add(1, std::memory_order_relaxed);
}

void SamplingEventProcessor::didStartSession(const Session& session) {
    if (sessionIdentifier_ != session.identifier) {
        sessionIdentifier_ = session.identifier;
        isKept_ = keeps(sessionIdentifier_, keepOneIn_);
        if (!isKept_) droppedSessions_.fetch_add(1, std::memory_order_relaxed);
    }
    ForwardingEventProcessor::didStartSession(session);
}

}  // namespace corvane
