#pragma once

#include <corvane/Models/ProcessEvent.h>
#include <corvane/Platform/Error.h>

#include <atomic>
#include <functional>
#include <utility>
#include <variant>

namespace corvane {

/// A submission that waits for the host to say go. Made by `Tracker::delayedSubmit`; the host holds it.
///
/// Open until the first `commit`, then sealed. A token that is never committed submits nothing; it does not keep its
/// tracker alive.
class DelayedToken {
  public:
    explicit DelayedToken(std::function<void()> block) : block_(std::move(block)) {}
    DelayedToken(const DelayedToken&) = delete;
    DelayedToken& operator=(const DelayedToken&) = delete;

    /// Submits the event, with the time of the `delayedSubmit` call. Ignored on a sealed token. Any thread.
    void commit() {
        if (!sealed_.exchange(true)) std::exchange(block_, nullptr)();
    }

    [[nodiscard]] bool sealed() const { return sealed_; }

  private:
    std::function<void()> block_;  // whoever seals the token takes it
    std::atomic<bool> sealed_ = false;
};

/// The outcome of a submission: the event that was handed on, or the error that stopped it.
class EventSubmitResult {
  public:
    [[nodiscard]] static EventSubmitResult success(ProcessEvent event) { return {std::in_place, std::move(event)}; }
    [[nodiscard]] static EventSubmitResult failed(AnyError error) { return {std::in_place, std::move(error)}; }

    [[nodiscard]] bool succeeded() const { return event() != nullptr; }
    /// The event of a success, or nullptr.
    [[nodiscard]] const ProcessEvent* event() const { return std::get_if<ProcessEvent>(&value_); }
    /// The error of a failure, or nullptr: `TrackerError`, `EncodingError`, `DataEventError`, or what the host's own
    /// encoding threw.
    [[nodiscard]] const AnyError* error() const { return std::get_if<AnyError>(&value_); }

  private:
    template <class V>
    EventSubmitResult(std::in_place_t, V&& value) : value_(std::forward<V>(value)) {}

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
