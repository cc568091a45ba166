#include <corvane/Bridge/Data/BridgedTracker.h>

#include <corvane/Bridge/Data/BridgedEventMirrorStore.h>

#include <corvane/Bridge/Data/StackEntry.h>
#include <corvane/Bridge/Models/Refusal.h>

#include <utility>

namespace corvane {

namespace {

SubmitOptions options(bool onlyIfTimed, BridgedSubmitCompletion completion) {
    return {.onlyIfTimed = onlyIfTimed, .completion = bridge::libraryCompletion(std::move(completion))};
}

}  // namespace

BridgedTracker::BridgedTracker(std::shared_ptr<Tracker> tracker)
    : tracker_(bridge::present(std::move(tracker), "the tracker")),
      eventMirrorStore_(std::make_shared<BridgedEventMirrorStore>()) {}
BridgedTracker::~BridgedTracker() = default;

const std::string& BridgedTracker::name() const {
    return tracker_->name();
}
std::vector<std::string> BridgedTracker::path() const {
    return tracker_->path();
}

EventSubmit BridgedTracker::eventSubmit(const BridgedEventClass& eventType) const {
    return BridgedEventMirrorStore::eventSubmit(eventMirrorStore_, eventType);
}

bool BridgedTracker::timeEventType(const BridgedEventClass& eventType, bool submitAndRestartWithSession,
                                   BridgedError* error) {
    return timeEventType(eventType, now(), submitAndRestartWithSession, error);
}

bool BridgedTracker::timeEventType(const BridgedEventClass& eventType, Date startTime, bool submitAndRestartWithSession,
                                   BridgedError* error) {
    return bridge::attempt("timeEventType", error, [&] {
        bridge::requireUTF8(eventType.eventName(), "the event's name");
        tracker_->time(eventSubmit(eventType), startTime, submitAndRestartWithSession);
    });
}

bool BridgedTracker::timeRawEvent(const BridgedRawEvent& event, bool submitAndRestartWithSession, BridgedError* error) {
    return timeRawEvent(event, now(), submitAndRestartWithSession, error);
}

bool BridgedTracker::timeRawEvent(const BridgedRawEvent& event, Date startTime, bool submitAndRestartWithSession,
                                  BridgedError* error) {
    return bridge::attempt("timeRawEvent", error, [&] {
        event.check();
        tracker_->time(event.eventSubmit(), startTime, submitAndRestartWithSession);
    });
}

void BridgedTracker::submitEventType(const BridgedEventClass& eventType, bool onlyIfTimed,
                                     BridgedSubmitCompletion completion) {
    explicitSubmitEvent(eventType, now(), onlyIfTimed, std::move(completion));
}

void BridgedTracker::submitRawEvent(const BridgedRawEvent& event, bool onlyIfTimed,
                                    BridgedSubmitCompletion completion) {
    explicitSubmitRawEvent(event, now(), onlyIfTimed, std::move(completion));
}

std::shared_ptr<DelayedToken> BridgedTracker::delayedSubmitEventType(const BridgedEventClass& eventType,
                                                                     bool onlyIfTimed,
                                                                     BridgedSubmitCompletion completion) {
    return tracker_->delayedSubmit(eventSubmit(eventType), options(onlyIfTimed, std::move(completion)));
}

std::shared_ptr<DelayedToken> BridgedTracker::delayedSubmitRawEvent(const BridgedRawEvent& event, bool onlyIfTimed,
                                                                    BridgedSubmitCompletion completion) {
    return tracker_->delayedSubmit(event.eventSubmit(), options(onlyIfTimed, std::move(completion)));
}

void BridgedTracker::explicitSubmitEvent(const BridgedEventClass& eventType, Date submitTime, bool onlyIfTimed,
                                         BridgedSubmitCompletion completion) {
    tracker_->submit(eventSubmit(eventType), submitTime, options(onlyIfTimed, std::move(completion)));
}

void BridgedTracker::explicitSubmitRawEvent(const BridgedRawEvent& event, Date submitTime, bool onlyIfTimed,
                                            BridgedSubmitCompletion completion) {
    tracker_->submit(event.eventSubmit(), submitTime, options(onlyIfTimed, std::move(completion)));
}

bool BridgedTracker::pushDataEvent(const Data& data, BridgedDataEventTraits traits, BridgedError* error,
                                   std::source_location where) {
    return bridge::attempt("pushDataEvent", error, [&] {
        std::optional<AnyError> failure;
        tracker_->push(bridge::stackEntry(data, traits, {.file = where.file_name(), .line = where.line()}, failure));
        if (failure) failure->rethrow();
    });
}

bool BridgedTracker::pushDataEvent(const Data& data, BridgedDataEventTraits traits, std::string file,
                                   std::uint_least32_t line, BridgedError* error) {
    return bridge::attempt("pushDataEvent", error, [&] {
        std::optional<AnyError> failure;
        tracker_->push(bridge::stackEntry(data, traits, {.ownFile = std::move(file), .line = line}, failure));
        if (failure) failure->rethrow();
    });
}

bool BridgedTracker::pushEncodedDataEvent(std::string dataName, JSON dictionary, BridgedDataEventTraits traits,
                                          std::string file, std::uint_least32_t line, BridgedError* error) {
    return bridge::attempt("pushEncodedDataEvent", error, [&] {
        tracker_->push(bridge::stackEntry(std::move(dataName), std::move(dictionary), traits,
                                          {.ownFile = std::move(file), .line = line}));
    });
}

void BridgedTracker::popDataEventType(const BridgedDataEventClass& dataType) {
    popDataEventByName(dataType.dataName());
}

void BridgedTracker::popDataEventByName(const std::string& dataName) {
    tracker_->pop(dataName, bridge::stackEntryType());
}

std::shared_ptr<BridgedTracker> BridgedTracker::chainWithName(std::string name, BridgedError* error) {
    std::shared_ptr<BridgedTracker> child;
    bridge::attempt("chainWithName", error, [&] {
        bridge::requireUTF8(name, "the tracker's name");
        child = std::make_shared<BridgedTracker>(tracker_->chain(std::move(name)));
    });
    return child;
}

std::shared_ptr<BridgedSessionObserver> BridgedTracker::onSessionChangeWithBlock(SessionChangeBlock block) {
    Tracker::SessionChangeBlock bridged;
    if (block) {
        bridged = [store = eventMirrorStore_, block = std::move(block)](const AccessTracker& access,
                                                                        SessionChange change) {
            block(std::make_shared<BridgedAccessTracker>(access, store), change);
        };
    }
    return std::make_shared<BridgedSessionObserver>(tracker_->onSessionChange(std::move(bridged)));
}

void BridgedTracker::removeSessionObserversForObject(const std::shared_ptr<const void>& object) {
    tracker_->removeSessionObservers(object);
}

void BridgedTracker::removeSessionObserversForObject(const std::shared_ptr<BridgedTracker>& object) {
    if (!object) return;
    tracker_->removeSessionObservers(object->tracker_);
    tracker_->removeSessionObservers(object);  // those that were bounded by the bridged object
}

void BridgedTracker::transactionWithBlock(AccessBlock block) {
    if (!block) return;
    tracker_->transaction([store = eventMirrorStore_, block = std::move(block)](const AccessTracker& access) {
        block(std::make_shared<BridgedAccessTracker>(access, store));
    });
}

void BridgedTracker::whenSession(AccessBlock block) {
    if (!block) return;
    tracker_->whenSession([store = eventMirrorStore_, block = std::move(block)](const AccessTracker& access) {
        block(std::make_shared<BridgedAccessTracker>(access, store));
    });
}

bool BridgedTracker::enterGroupWithName(std::string groupName, BridgedError* error) {
    return bridge::attempt("enterGroupWithName", error, [&] {
        bridge::requireUTF8(groupName, "the group's name");
        tracker_->enterGroup(std::move(groupName));
    });
}

void BridgedTracker::enterGroup() {
    tracker_->enterGroup({});
}
void BridgedTracker::leaveGroup() {
    tracker_->leaveGroup();
}

void BridgedTracker::suspend() {
    tracker_->suspend();
}
void BridgedTracker::resume() {
    tracker_->resume();
}

BridgedSessionObserver::BridgedSessionObserver(std::shared_ptr<SessionObserver> sessionObserver)
    : sessionObserver_(std::move(sessionObserver)) {}
BridgedSessionObserver::~BridgedSessionObserver() = default;

void BridgedSessionObserver::disposeOnObject(const std::shared_ptr<const void>& object) {
    sessionObserver_->disposeOn(object);
}

}  // namespace corvane
