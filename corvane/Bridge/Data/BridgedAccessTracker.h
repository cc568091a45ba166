#pragma once

#include <corvane/Bridge/Data/BridgedDataEventClass.h>
#include <corvane/Bridge/Data/BridgedRawEvent.h>
#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Bridge/Session/BridgedEventProcessorType.h>
#include <corvane/Export.h>
#include <corvane/Tracker/AccessTracker.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <source_location>
#include <string>

namespace corvane {

class BridgedEventMirrorStore;

/// Called once with the outcome of a submission, on the tracker's queue: the event that was handed on, or the error
/// that stopped it; the other one is nullptr. Both are good for the length of the call. What it throws is logged.
/// Callers see it as `CVSubmitCompletion`.
using BridgedSubmitCompletion = std::function<void(const BridgedProcessEvent* event, const BridgedError* error)>;

/// A handle on a tracker for blocks that run on the tracker's queue. Callers see it as `CVAccessTracker`.
///
/// The members mean what they mean on `BridgedTracker` but run inline: their effect, and a submission's completion, has
/// happened when the call returns. It does not keep its tracker alive; once that is gone every call does nothing, calls
/// no completion and returns true. A call off the tracker's queue is refused with `BridgeError::wrongQueue`, by
/// completion or return value. May be kept, and used in later blocks of the same tracker.
class CORVANE_EXPORT BridgedAccessTracker {
  public:
    using Data = std::shared_ptr<const BridgedDataEventType>;

    BridgedAccessTracker(AccessTracker accessTracker, std::shared_ptr<BridgedEventMirrorStore> eventMirrorStore);
    ~BridgedAccessTracker();

    bool timeEventType(const BridgedEventClass& eventType, bool submitAndRestartWithSession = false,
                       BridgedError* error = nullptr) const;
    bool timeRawEvent(const BridgedRawEvent& event, bool submitAndRestartWithSession = false,
                      BridgedError* error = nullptr) const;

    void submitEventType(const BridgedEventClass& eventType, bool onlyIfTimed = false,
                         BridgedSubmitCompletion completion = {}) const;
    void submitRawEvent(const BridgedRawEvent& event, bool onlyIfTimed = false,
                        BridgedSubmitCompletion completion = {}) const;

    bool pushDataEvent(const Data& data, BridgedDataEventTraits traits = {}, BridgedError* error = nullptr,
                       std::source_location where = std::source_location::current()) const;
    bool pushDataEvent(const Data& data, BridgedDataEventTraits traits, std::string file, std::uint_least32_t line,
                       BridgedError* error = nullptr) const;
    bool pushEncodedDataEvent(std::string dataName, JSON dictionary, BridgedDataEventTraits traits, std::string file,
                              std::uint_least32_t line, BridgedError* error = nullptr) const;
    bool popDataEventType(const BridgedDataEventClass& dataType, BridgedError* error = nullptr) const;
    bool popDataEventByName(const std::string& dataName, BridgedError* error = nullptr) const;

  private:
    /// Throws `BridgeError::wrongQueue` off the queue.
    void requireQueue() const;
    void submit(const EventSubmit& event, bool onlyIfTimed, BridgedSubmitCompletion completion) const;

    const AccessTracker accessTracker_;
    const std::shared_ptr<BridgedEventMirrorStore> eventMirrorStore_;
};

}  // namespace corvane
