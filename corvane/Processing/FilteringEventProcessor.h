#pragma once

#include <corvane/Export.h>
#include <corvane/Processing/ForwardingEventProcessor.h>

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>

namespace corvane {

/// Asks a function of the host's about every event before the wrapped processor gets it; everything else goes through.
///
/// An event goes on only when the filter has said so: when the filter throws, or returns what cannot become part of a
/// document, an error is logged and the event is dropped. A filter that is to remove personal data and fails must not
/// let it out.
///
/// It sees events alone. The data of a session goes through as it was pushed, other processors and completions get the
/// event as it was submitted, and what was stored before the filter was put in place goes out as it is. The completion
/// of a submission reports success for an event that is dropped here.
///
/// The host makes it and adds it to one session manager in place of the processor that it wraps. The counts may be read
/// from any thread.
///
///     auto noClicks = [](const ProcessEvent& event) -> std::optional<ProcessEvent> {
///         if (event.name() == "Click") return std::nullopt;
///         return event;
///     };
///     sessions.processorManager()->add(std::make_shared<FilteringEventProcessor>(uploads, noClicks));
class CORVANE_EXPORT FilteringEventProcessor final : public ForwardingEventProcessor {
  public:
    /// Returns the event as it is to go on: itself, another one in its place, or nothing. Called on the access queue,
    /// for which it must not wait, once for each event, in order. The JSON of another event is an object; its group's
    /// name says which document it goes into.
    using Filter = std::function<std::optional<ProcessEvent>(const ProcessEvent&)>;

    /// Throws `InvalidArgument` for a null pointer and for a filter that is empty.
    FilteringEventProcessor(std::shared_ptr<EventProcessorType> eventProcessor, Filter filter);
    ~FilteringEventProcessor() override;

    /// How many events went on with another name, JSON or group.
    [[nodiscard]] std::uint64_t rewrittenEvents() const { return rewrittenEvents_.load(std::memory_order_relaxed); }
    /// How many events did not go on, failures included.
    [[nodiscard]] std::uint64_t droppedEvents() const { return droppedEvents_.load(std::memory_order_relaxed); }
    /// How many of the dropped ones were dropped because the filter failed.
    [[nodiscard]] std::uint64_t failures() const { return failures_.load(std::memory_order_relaxed); }

    void process(const ProcessEvent& processEvent) override;

  private:
    /// The event as the filter wants it, or nothing.
    [[nodiscard]] std::optional<ProcessEvent> filtered(const ProcessEvent& processEvent);

    const Filter filter_;
    std::atomic<std::uint64_t> rewrittenEvents_ = 0;
    std::atomic<std::uint64_t> droppedEvents_ = 0;
    std::atomic<std::uint64_t> failures_ = 0;
};

}  // namespace corvane
