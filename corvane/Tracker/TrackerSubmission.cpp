// A tracker's part in the way of an event, from the caller's thread to the session: what is compiled for speed.

#include <corvane/Tracker/Tracker.h>

#include <corvane/Models/EventData.h>
#include <corvane/Models/RejectedEvent.h>
#include <corvane/Platform/HostCall.h>
#include <corvane/Platform/JSONText.h>
#include <corvane/Platform/RecordingSwitch.h>
#include <corvane/Tracker/ActiveSessionType.h>
#include <corvane/Tracker/Sequence.h>
#include <corvane/Tracker/TrackerDelegate.h>
#include <corvane/Tracker/TrackerScope.h>

#include <utility>

namespace corvane {

namespace {

RejectedEvent::Reason rejectionReason(const AnyError& error) {
    using Reason = RejectedEvent::Reason;
    if (error.as<EncodingError>()) return Reason::encoding;
    const auto* own = error.as<TrackerError>();
    if (!own) return Reason::other;
    const auto code = own->value();
    return code == TrackerError::noSession      ? Reason::noSession
           : code == TrackerError::notRecording ? Reason::notRecording
                                                : Reason::missingData;
}

}  // namespace

void Tracker::submit(EventSubmit event, Date submitTime, SubmitOptions options) {
    accessQueue_->asyncInRun([self = shared_from_this(), event = std::move(event), submitTime,
                              options = std::move(options), isRecorded = RecordingSwitch::isOn()]() mutable {
        if (options.onlyIfTimed && self->isUntimed(event)) return;
        auto result = self->performSubmit(event, submitTime, isRecorded);
        if (!options.completion) return;
        self->accessQueue_->atEndOfRun(SerialQueue::RunEnd::report,
                                       [completion = std::move(options.completion), result = std::move(result)] {
                                           callHost("submit completion", [&] { completion(result); });
                                       });
    });
}

void Tracker::time(EventSubmit event, Date startTime, bool submitAndRestartWithSession) {
    accessQueue_->asyncInRun(
        [self = shared_from_this(), event = std::move(event), startTime, submitAndRestartWithSession] {
            self->performTime(event, startTime, submitAndRestartWithSession);
        });
}

void Tracker::push(AnyDataEventEntry entry) {
    accessQueue_->asyncInRun(
        [self = shared_from_this(), entry = std::move(entry)]() mutable { self->performPush(std::move(entry)); });
}

bool Tracker::isUntimed(const EventSubmit& event) const {
    accessQueue_->assertCurrent("Tracker submission");
    const auto delegate = delegate_.lock();
    return delegate && delegate->activeSession() && !scope_->timers.contains(event.name());
}

void Tracker::submitNow(const EventSubmit& event, Date submitTime, const SubmitOptions& options) {
    accessQueue_->assertCurrent("Tracker submission");
    accessQueue_->endRun();  // what was submitted before is told before
    if (options.onlyIfTimed && isUntimed(event)) return;
    const auto result = performSubmit(event, submitTime);
    accessQueue_->endRun();
    if (options.completion) callHost("submit completion", [&] { options.completion(result); });
}

EventSubmitResult Tracker::performSubmit(const EventSubmit& event, Date submitTime, bool isRecorded) {
    const auto delegate = delegate_.lock();
    const ActiveSessionType* session = delegate ? delegate->activeSession() : nullptr;
    const auto rejected = [&](AnyError error) {
        if (delegate) delegate->didReject({event.name(), rejectionReason(error), error});
        return EventSubmitResult::failed(std::move(error));
    };
    if (!session) return rejected(AnyError(TrackerError::withoutSession()));
    if (!isRecorded || !RecordingSwitch::isOn()) return rejected(AnyError(TrackerError::withoutRecording()));
    try {
        return EventSubmitResult::success(process(event, submitTime, *delegate, session->identifier()));
    } catch (...) {
        return rejected(AnyError::current());
    }
}

ProcessEvent Tracker::process(const EventSubmit& event, Date submitTime, TrackerDelegate& delegate,
                              const std::string& sessionID) {
    // A document could not say what the event is called, and the event would be lost behind its success.
    if (!jsontext::isUTF8(event.name())) throw EncodingError(EncodingError::notUTF8, "metadata.name");
    const EventMirrorProperties properties = event.properties(*eventMirrorStore_);
    ProcessEvent processEvent(std::string(event.name()), encode(resolve(*properties, event, submitTime, sessionID)),
                              groupName());
    delegate.process(processEvent);
    return processEvent;
}

Sequence Tracker::resolve(const std::vector<EventMirrorProperty>& properties, const EventSubmit& event, Date submitTime,
                          const std::string& sessionID) {
    Sequence sequence{{}, {}, submitTime};
    std::vector<TrackerError::MissingData> missing;
    for (const auto& [name, property] : properties) {
        const bool isRequired = !property->isOptional();
        if (isRequired && property->isDataType(DataType::of<EventData>())) {
            sequence.identity = identity(sessionID);
            sequence.entries.push_back({name, std::nullopt});
            continue;
        }
        auto data = isRequired ? span(*property, event, submitTime) : std::nullopt;
        if (!data) data = lookup(property->dataKey());
        if (data && !property->isDataType(data->type())) reportOtherType(name, *property, data->type());
        if (data) {
            sequence.entries.push_back({name, std::move(data)});
        } else if (isRequired) {
            missing.push_back({name, property->dataType(), std::string(property->dataKey())});
        }
    }
    if (!missing.empty()) throw TrackerError::missing(std::move(missing));
    return sequence;
}

/// The span of an event whose timer runs, which ends the timer.
std::optional<AnyDataEvent> Tracker::span(const EventPropertyType& property, const EventSubmit& event,
                                          Date submitTime) {
    accessQueue_->assertCurrent("Tracker submission");
    if (property.trait() == EventPropertyTrait::data && property.isDataType(DataType::of<TimedData>())) {
        if (const auto timer = scope_->timers.find(event.name()); timer != scope_->timers.end()) {
            const TimedData span(timer->second.startTime, submitTime);
            scope_->timers.erase(timer);
            if (const auto restart = scope_->restartTimers.find(event.name()); restart != scope_->restartTimers.end()) {
                scope_->restartTimers.erase(restart);
            }
            return AnyDataEvent(span);
        }
    }
    return std::nullopt;
}

std::optional<AnyDataEvent> Tracker::lookup(std::string_view key) {
    for (Tracker* tracker = this; tracker; tracker = tracker->parentTracker_.get()) {
        tracker->accessQueue_->assertCurrent("Tracker lookup");
        if (auto data = tracker->scope_->dataStacks.take(key)) return data;
    }
    return std::nullopt;
}

std::optional<std::string> Tracker::groupName() {
    for (Tracker* tracker = this; tracker; tracker = tracker->parentTracker_.get()) {
        tracker->accessQueue_->assertCurrent("Tracker group");
        if (!tracker->scope_->groupStack.empty()) return tracker->scope_->groupStack.back().name;
    }
    return std::nullopt;
}

std::shared_ptr<const EventIdentity> Tracker::identity(const std::string& sessionID) {
    accessQueue_->assertCurrent("Tracker identity");
    if (!scope_->identity || scope_->identity->sessionID() != sessionID) {
        std::string eventPath;
        for (const auto& component : path()) eventPath += "/" + component;
        scope_->identity = std::make_shared<const EventIdentity>(eventPath, sessionID);
    }
    return scope_->identity;
}

void Tracker::performPush(AnyDataEventEntry entry) {
    accessQueue_->assertCurrent("Tracker push");
    scope_->dataStacks.push(std::move(entry));
}
}  // namespace corvane
