#pragma once

#include <corvane/Export.h>
#include <corvane/Processing/ForwardingEventProcessor.h>

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

namespace corvane {

/// Keeps the events of one session in N, whole, and drops those of the others; everything else goes through to the
/// wrapped processor, so that a dropped session still starts, ends and takes up what earlier runs left.
///
/// Which sessions are kept follows from the session's identifier alone: those whose CRC-32 is a multiple of N. Every
/// process, run and version decides alike, and a collector can find out from the "sessionID" of a document. A session
/// that is kept at one in 100 is kept at one in 10 too. So a sampler in a sampler keeps what both keep: one in 2 around
/// one in 4 is one in 4.
///
/// The completion of a submission reports success for an event that is dropped here: the event is complete, and other
/// processors have it. What was stored before the sampler was put in place goes out as it is.
///
/// The host makes it and adds it to one session manager in place of the processor that it wraps. The counts may be read
/// from any thread.
///
///     auto uploads = std::make_shared<UploadBatchEventProcessor>(client, endpoint);
///     sessions.processorManager()->add(std::make_shared<SamplingEventProcessor>(uploads, 10));
class CORVANE_EXPORT SamplingEventProcessor final : public ForwardingEventProcessor {
  public:
    /// @param keepOneIn keeps one session in so many; 1 keeps all
    /// Throws `InvalidArgument` below 1, and for a null pointer.
    SamplingEventProcessor(std::shared_ptr<EventProcessorType> eventProcessor, int keepOneIn);
    ~SamplingEventProcessor() override;

    /// Whether a sampler that keeps one session in `keepOneIn` keeps this one. Throws `InvalidArgument` below 1.
    [[nodiscard]] static bool keeps(std::string_view sessionIdentifier, int keepOneIn);

    /// How many sessions started whose events were dropped, those without events included.
    [[nodiscard]] std::uint64_t droppedSessions() const { return droppedSessions_.load(std::memory_order_relaxed); }
    /// How many events were dropped.
    [[nodiscard]] std::uint64_t droppedEvents() const { return droppedEvents_.load(std::memory_order_relaxed); }

    void process(const ProcessEvent& processEvent) override;
    void didStartSession(const Session& session) override;

  private:
    const int keepOneIn_;
    // On the access queue.
    std::string sessionIdentifier_;  // a processor that is added again is told again of the session that runs
    bool isKept_ = true;
    // From any thread.
    std::atomic<std::uint64_t> droppedSessions_ = 0;
    std::atomic<std::uint64_t> droppedEvents_ = 0;
};

}  // namespace corvane
