#pragma once

#include <corvane/Models/ProcessEvent.h>
#include <corvane/Platform/Error.h>

#include <functional>
#include <utility>
#include <variant>

namespace corvane {

/// The outcome of a submission: the event that was handed on, or the error that stopped it.
class EventSubmitResult {
  public:
    [[nodiscard]] static EventSubmitResult success(ProcessEvent event) { return EventSubmitResult(std::move(event)); }
    [[nodiscard]] static EventSubmitResult failed(AnyError error) { return EventSubmitResult(std::move(error)); }

    [[nodiscard]] bool succeeded() const { return event() != nullptr; }
    /// The event of a success, or nullptr.
    [[nodiscard]] const ProcessEvent* event() const { return std::get_if<ProcessEvent>(&value_); }
    /// The error of a failure, or nullptr: `TrackerError`, `EncodingError`, `DataEventError`, or what the host's own
    /// encoding threw.
    [[nodiscard]] const AnyError* error() const { return std::get_if<AnyError>(&value_); }

  private:
    template <class V>
    explicit EventSubmitResult(V value) : value_(std::move(value)) {}

    std::variant<ProcessEvent, AnyError> value_;
};

/// Called once with the outcome, on the tracker's queue.
using EventSubmitCompletion = std::function<void(const EventSubmitResult&)>;

/// What a submission may be told beside its event.
struct SubmitOptions {
    /// Submit only if a timer runs for the event on this tracker; otherwise nothing happens at all, and the completion
    /// is not called.
    bool onlyIfTimed = false;
    EventSubmitCompletion completion = {};
};

}  // namespace corvane
