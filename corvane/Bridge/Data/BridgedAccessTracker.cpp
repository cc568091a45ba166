#include <corvane/Bridge/Data/BridgedAccessTracker.h>

#include <corvane/Bridge/Data/BridgedEventMirrorStore.h>

#include <corvane/Bridge/Data/StackEntry.h>
#include <corvane/Bridge/Models/Refusal.h>
#include <corvane/Platform/HostCall.h>

#include <utility>

namespace corvane {

BridgedAccessTracker::BridgedAccessTracker(AccessTracker accessTracker,
                                           std::shared_ptr<BridgedEventMirrorStore> eventMirrorStore)
    : accessTracker_(std::move(accessTracker)), eventMirrorStore_(std::move(eventMirrorStore)) {}
BridgedAccessTracker::~BridgedAccessTracker() = default;

void BridgedAccessTracker::requireQueue() const {
    if (!accessTracker_.isUsable()) throw BridgeError(BridgeError::wrongQueue, "the tracker's handle");
}

bool BridgedAccessTracker::timeEventType(const BridgedEventClass& eventType, bool submitAndRestartWithSession,
                                         BridgedError* error) const {
    return bridge::attempt("timeEventType", error, [&] {
        requireQueue();
        bridge::requireUTF8(eventType.eventName(), "the event's name");
        accessTracker_.time(BridgedEventMirrorStore::eventSubmit(eventMirrorStore_, eventType), now(),
                            submitAndRestartWithSession);
    });
}

bool BridgedAccessTracker::timeRawEvent(const BridgedRawEvent& event, bool submitAndRestartWithSession,
                                        BridgedError* error) const {
    return bridge::attempt("timeRawEvent", error, [&] {
        requireQueue();
        event.check();
        accessTracker_.time(event.eventSubmit(), now(), submitAndRestartWithSession);
    });
}

void BridgedAccessTracker::submitEventType(const BridgedEventClass& eventType, bool onlyIfTimed,
                                           BridgedSubmitCompletion completion) const {
    submit(BridgedEventMirrorStore::eventSubmit(eventMirrorStore_, eventType), onlyIfTimed, std::move(completion));
}

void BridgedAccessTracker::submitRawEvent(const BridgedRawEvent& event, bool onlyIfTimed,
                                          BridgedSubmitCompletion completion) const {
    submit(event.eventSubmit(), onlyIfTimed, std::move(completion));
}

void BridgedAccessTracker::submit(const EventSubmit& event, bool onlyIfTimed,
                                  BridgedSubmitCompletion completion) const {
    BridgedError error;
    if (bridge::attempt("submit", &error, [&] { requireQueue(); })) {
        accessTracker_.submit(event, now(),
                              {.onlyIfTimed = onlyIfTimed, .completion = bridge::libraryCompletion(completion)});
    } else if (completion) {
        callHost("submit completion", [&] { completion(nullptr, &error); });
    }
}

bool BridgedAccessTracker::pushDataEvent(const Data& data, BridgedDataEventTraits traits, BridgedError* error,
                                         std::source_location where) const {
    return bridge::attempt("pushDataEvent", error, [&] {
        requireQueue();
        std::optional<AnyError> failure;
        accessTracker_.push(
            bridge::stackEntry(data, traits, {.file = where.file_name(), .line = where.line()}, failure));
        if (failure) failure->rethrow();
    });
}

bool BridgedAccessTracker::pushDataEvent(const Data& data, BridgedDataEventTraits traits, std::string file,
                                         std::uint_least32_t line, BridgedError* error) const {
    return bridge::attempt("pushDataEvent", error, [&] {
        requireQueue();
        std::optional<AnyError> failure;
        accessTracker_.push(bridge::stackEntry(data, traits, {.ownFile = std::move(file), .line = line}, failure));
        if (failure) failure->rethrow();
    });
}

bool BridgedAccessTracker::pushEncodedDataEvent(std::string dataName, JSON dictionary, BridgedDataEventTraits traits,
                                                std::string file, std::uint_least32_t line, BridgedError* error) const {
    return bridge::attempt("pushEncodedDataEvent", error, [&] {
        requireQueue();
        accessTracker_.push(bridge::stackEntry(std::move(dataName), std::move(dictionary), traits,
                                               {.ownFile = std::move(file), .line = line}));
    });
}

bool BridgedAccessTracker::popDataEventType(const BridgedDataEventClass& dataType, BridgedError* error) const {
    return popDataEventByName(dataType.dataName(), error);
}

bool BridgedAccessTracker::popDataEventByName(const std::string& dataName, BridgedError* error) const {
    return bridge::attempt("popDataEvent", error, [&] {
        requireQueue();
        accessTracker_.pop(dataName, bridge::stackEntryType());
    });
}

}  // namespace corvane
