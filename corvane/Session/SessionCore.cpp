#include <corvane/Session/SessionCore.h>

#include <corvane/Platform/HostCall.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/RecordingSwitch.h>
#include <corvane/Platform/UUID.h>

#include <algorithm>
#include <iterator>
#include <set>
#include <utility>
#include <vector>

namespace corvane {

SessionCore::SessionCore()
    : accessQueue_(
          std::make_shared<SerialQueue>("com.veskar.corvane.event-tracker", SerialQueue::QualityOfService::background)),
      processorManager_(std::make_shared<ProcessorManager>(accessQueue_)) {}

SessionCore::~SessionCore() = default;

std::shared_ptr<SessionCore> SessionCore::make() {
    std::shared_ptr<SessionCore> core(new SessionCore);
    core->tracker_ = Tracker::makeRoot("root", core->accessQueue_, core);
    core->processorManager_->setSessionProvider(core);
    return core;
}

void SessionCore::close() {
    const Lock lock(suspensionMutex_);
    closed_ = true;
    for (auto count = suspendCount_.exchange(0); count > 0; --count) accessQueue_->resume();
}

void SessionCore::suspend() {
    const Lock lock(suspensionMutex_);
    if (closed_) return;
    suspendCount_.add(1);
    accessQueue_->suspend();
}

void SessionCore::resume() {
    const Lock lock(suspensionMutex_);
    if (closed_) return;
    suspendCount_.add(-1);
    accessQueue_->resume();
}

void SessionCore::start(Session::Kind kind, Date startDate) {
    accessQueue_->assertCurrent("SessionManager start");
    if (isActive()) return;
    finishForgetting();
    announce(SessionChange::willStart);
    state_ = std::make_unique<ActiveSession>(newUUID(), std::move(kind), startDate);
    processorManager_->didStartSession(*currentSession());
    announce(SessionChange::didStart);
}

void SessionCore::end(Date endDate) {
    accessQueue_->assertCurrent("SessionManager end");
    if (!isActive()) return;
    announce(SessionChange::willEnd);
    const Session session = *currentSession();
    state_ = session;
    processorManager_->didEndSession(session, endDate);
    announce(SessionChange::didEnd);
    pruneOnceOnlyData();
}

void SessionCore::abandon() {
    accessQueue_->assertCurrent("SessionManager destructor");
    state_ = None{};
}

void SessionCore::forget(ForgetCompletion completion) {
    accessQueue_->assertCurrent("SessionManager forget");
    const auto call = [completion = std::move(completion)](const ForgottenRecords& forgotten, const AnyError* error) {
        if (completion) callHost("forget completion", [&] { completion(forgotten, error); });
    };
    accessQueue_->endRun();  // what was submitted before is told to be on disk before it is dropped
    std::int64_t epoch = 0;
    try {
        epoch = RecordingSwitch::raiseEpoch();
    } catch (...) {
        const auto error = AnyError::current();
        Log::shared().error("Failed to begin to forget, error=%{public}@", error.what());
        return call({}, &error);
    }
    const auto own = processorManager_->forget();
    forgetDirectory(epoch, [queue = accessQueue_, own, call](const ForgottenRecords& stored, const AnyError* error) {
        const ForgottenRecords all{own.events + stored.events, own.documents + stored.documents};
        queue->async([call, all, error = error ? std::optional(*error) : std::nullopt] {
            call(all, error ? &*error : nullptr);
        });
    });
}

void SessionCore::push(AnyDataEventEntry entry, bool submitEventQueues) {
    accessQueue_->assertCurrent("SessionManager push");
    dataStacks_.push(std::move(entry));
    if (const auto session = currentSession()) processorManager_->didUpdateSession(*session, submitEventQueues);
}

const ActiveSessionType* SessionCore::activeSession() const {
    accessQueue_->assertCurrent("SessionManager activeSession");
    const auto* active = std::get_if<std::unique_ptr<ActiveSession>>(&state_);
    return active ? active->get() : nullptr;
}

void SessionCore::process(const ProcessEvent& event) {
    accessQueue_->assertCurrent("SessionManager process");
    if (auto* active = std::get_if<std::unique_ptr<ActiveSession>>(&state_)) (*active)->append(event);
    processorManager_->process(event);
}

void SessionCore::didReject(const RejectedEvent& event) {
    // Nothing is stored meanwhile, with which another process's word would be heard.
    if (event.reason == RejectedEvent::Reason::notRecording) RecordingSwitch::look();
    processorManager_->didReject(event);
}

void SessionCore::addSessionObserver(std::shared_ptr<SessionObserver> observer) {
    accessQueue_->async([self = shared_from_this(), observer = std::move(observer)]() mutable {
        self->addSessionObserverNow(std::move(observer));
    });
}

void SessionCore::addSessionObserverNow(std::shared_ptr<SessionObserver> observer) {
    accessQueue_->assertCurrent("SessionManager addSessionObserver");
    // Looking through all of them at every registration would make many trackers cost their square.
    if (observers_.size() >= pruneAt_) {
        dropObservers([](const SessionObserver& registered) { return !registered.object(); });
        pruneAt_ = std::max<std::size_t>(16, observers_.size() * 2);
    }
    observers_.push_back(std::move(observer));
}

template <class Predicate>
void SessionCore::dropObservers(Predicate isOver) {
    accessQueue_->assertCurrent("SessionManager dropObservers");
    // Moved out first: what an observer's block holds is the host's, and may do anything when it is destroyed.
    const auto over = std::stable_partition(observers_.begin(), observers_.end(),
                                            [&](const auto& registered) { return !isOver(*registered); });
    const std::vector<std::shared_ptr<SessionObserver>> dropped(std::make_move_iterator(over),
                                                                std::make_move_iterator(observers_.end()));
    observers_.erase(over, observers_.end());
}

void SessionCore::removeSessionObservers(std::weak_ptr<const void> object) {
    accessQueue_->async([self = shared_from_this(), object = std::move(object)] {
        self->accessQueue_->assertCurrent("SessionManager removeSessionObservers");
        self->dropObservers(
            [&](const SessionObserver& registered) { return !registered.object() || registered.isOwnedBy(object); });
    });
}

void SessionCore::didEnterGroup(const Group& group) {
    processorManager_->didEnterGroup(group);
}
void SessionCore::didLeaveGroup(const Group& group) {
    processorManager_->didLeaveGroup(group);
}

std::optional<Session> SessionCore::currentSession() const {
    accessQueue_->assertCurrent("SessionManager currentSession");
    const auto* active = std::get_if<std::unique_ptr<ActiveSession>>(&state_);
    if (!active) return std::nullopt;
    return sessionOf(**active);
}

Session SessionCore::sessionOf(const ActiveSession& active) const {
    return {active.identifier(), active.kind(), active.startDate(), sessionData(active.identifier())};
}

/// The identifier, then what lies on top of each stack; the first value of a key stays. Nothing is consumed.
JSON SessionCore::sessionData(const std::string& identifier) const {
    accessQueue_->assertCurrent("SessionManager sessionData");
    Encoder encoder;
    encoder.beginObject();
    encoder.key("sessionID");
    encoder.string(identifier);
    std::set<std::string> keys{"sessionID"};
    std::vector<AnyDataEvent> tops;  // encoding is the host's code, which may push in the meantime
    for (const auto& [key, stack] : dataStacks_.all()) {
        if (const AnyDataEventEntry* top = stack.top()) tops.push_back(top->data);
    }
    for (const AnyDataEvent& top : tops) {
        std::optional<JSON::Object> dict;
        callHost("session data", [&] { dict = top.toDict().object(); });
        if (!dict) continue;
        for (const auto& [name, value] : *dict) {
            const auto [kept, isNew] = keys.insert(name);
            if (!isNew) continue;
            encoder.key(*kept);
            encoder.json(value);
        }
    }
    encoder.endObject();
    return std::move(encoder).takeJSON();
}

void SessionCore::announce(SessionChange change) {
    accessQueue_->assertCurrent("SessionManager announce");
    // A block may end the observation of another one by releasing its object; new registrations come later, so only
    // the ones there are now are told. Blocks cannot change the list under the loop but through addSessionObserverNow.
    const auto observers = observers_;
    for (const auto& observer : observers) observer->notify(change);
}

void SessionCore::pruneOnceOnlyData() {
    accessQueue_->assertCurrent("SessionManager prune");
    std::vector<AnyDataEventEntry> used;  // goes last: the host's data may push when it is destroyed
    auto& stacks = dataStacks_.all();
    for (auto stack = stacks.begin(); stack != stacks.end();) {
        const AnyDataEventEntry* top = stack->second.top();
        if (top && top->traits.contains(DataEventTrait::onlyOnce)) used.push_back(*stack->second.pop());
        stack = stack->second.isEmpty() ? stacks.erase(stack) : std::next(stack);
    }
}

}  // namespace corvane
