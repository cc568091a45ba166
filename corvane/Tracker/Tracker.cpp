#include <corvane/Tracker/Tracker.h>

#include <corvane/Models/EventMirrorStore.h>
#include <corvane/Platform/HostCall.h>
#include <corvane/Snapshot/Snapshot.h>
#include <corvane/Tracker/AccessTracker.h>
#include <corvane/Tracker/SessionObserver.h>
#include <corvane/Tracker/TrackerDelegate.h>
#include <corvane/Tracker/TrackerScope.h>

#include <algorithm>
#include <set>
#include <utility>

namespace corvane {

Tracker::Tracker(std::string name, std::shared_ptr<SerialQueue> accessQueue,
                 std::shared_ptr<EventMirrorStore> mirrorStore, std::shared_ptr<Tracker> parent,
                 std::weak_ptr<TrackerDelegate> delegate)
    : name_(std::move(name)),
      accessQueue_(std::move(accessQueue)),
      eventMirrorStore_(std::move(mirrorStore)),
      parentTracker_(std::move(parent)),
      delegate_(std::move(delegate)),
      scope_(std::make_unique<Scope>()) {}

Tracker::~Tracker() = default;

// A chain that falls free is released from its end to its root in one loop: its length is no depth of the stack.
void Tracker::release(Tracker* tracker) noexcept {
    thread_local std::shared_ptr<Tracker>* next = nullptr;  // where the loop that called takes the parent from
    auto* const loop = std::exchange(next, nullptr);
    std::shared_ptr<Tracker> parent = std::move(tracker->parentTracker_);
    delete tracker;  // and with it the host's data, which may release other trackers
    next = loop;
    if (loop) {
        *loop = std::move(parent);
        return;
    }
    while (parent) {
        std::shared_ptr<Tracker> grandparent;
        next = &grandparent;
        parent.reset();
        next = nullptr;
        parent = std::move(grandparent);
    }
}

std::shared_ptr<Tracker> Tracker::makeRoot(std::string name, std::shared_ptr<SerialQueue> accessQueue,
                                           std::weak_ptr<TrackerDelegate> delegate) {
    return {new Tracker(std::move(name), std::move(accessQueue), std::make_shared<EventMirrorStore>(), nullptr,
                        std::move(delegate)),
            &Tracker::release};
}

std::shared_ptr<Tracker> Tracker::chain(std::string name) {
    std::shared_ptr<Tracker> child(
        new Tracker(std::move(name), accessQueue_, eventMirrorStore_, shared_from_this(), delegate_),
        &Tracker::release);
    child->onSessionChange([](AccessTracker& access, SessionChange change) {
        if (const auto tracker = access.tracker()) tracker->react(change);
    });
    return child;
}

std::vector<std::string> Tracker::path() const {
    std::vector<std::string> names;
    for (const Tracker* tracker = this; tracker; tracker = tracker->parentTracker_.get()) {
        names.push_back(tracker->name_);
    }
    std::reverse(names.begin(), names.end());
    return names;
}

std::shared_ptr<DelayedToken> Tracker::delayedSubmit(EventSubmit event, SubmitOptions options) {
    return std::make_shared<DelayedToken>(
        [weak = weak_from_this(), event = std::move(event), submitTime = now(), options = std::move(options)] {
            if (const auto tracker = weak.lock()) tracker->submit(event, submitTime, options);
        });
}

void Tracker::transaction(std::function<void(AccessTracker&)> block) {
    accessQueue_->async([self = shared_from_this(), block = std::move(block)] {
        AccessTracker access(self);
        if (block) callHost("tracker transaction", [&] { block(access); });
    });
}

void Tracker::whenSession(std::function<void(AccessTracker&)> block) {
    accessQueue_->async([self = shared_from_this(), block = std::move(block)]() mutable {
        self->performWhenSession(std::move(block));
    });
}

std::shared_ptr<const SnapshotType> Tracker::snapshot(SnapshotPolicy policy) {
    accessQueue_->assertNotCurrent("Tracker::snapshot");
    return accessQueue_->sync(
        [&] { return std::make_shared<const Snapshot>(policy, levels(policy), eventMirrorStore_); });
}

void Tracker::pop(std::string_view key, DataType type) {
    accessQueue_->asyncInRun(
        [self = shared_from_this(), key = std::string(key), type] { self->performPop(key, type); });
}

void Tracker::enterGroup(std::string groupName) {
    accessQueue_->asyncInRun([self = shared_from_this(), group = Group{std::move(groupName), now()}]() mutable {
        self->performEnterGroup(std::move(group));
    });
}

void Tracker::leaveGroup() {
    accessQueue_->async([self = shared_from_this()] { self->performLeaveGroup(); });
}

std::shared_ptr<SessionObserver> Tracker::onSessionChange(SessionChangeBlock block) {
    auto observer = std::make_shared<SessionObserver>(AccessTracker(weak_from_this()), std::move(block));
    observer->disposeOn(weak_from_this());
    if (const auto delegate = delegate_.lock()) delegate->addSessionObserver(observer);
    return observer;
}

void Tracker::removeSessionObservers(const std::shared_ptr<const void>& object) {
    if (const auto delegate = delegate_.lock()) delegate->removeSessionObservers(object);
}

void Tracker::suspend() {
    if (const auto delegate = delegate_.lock()) delegate->suspend();
}

void Tracker::resume() {
    if (const auto delegate = delegate_.lock()) delegate->resume();
}

/// Two types of one name share their data, which a host seldom means. Declarations and data that are known by name only
/// have no type, and mean it.
void Tracker::reportOtherType(std::string_view name, const EventPropertyType& property, DataType found) {
    const std::string_view key = property.dataKey();
    const DataType declared = property.dataType();
    if (declared.name() != key || found.name() != key || !eventMirrorStore_->isNews(declared, found)) return;
    Log::shared().error(
        "A property is filled by another type of the same name, property=%{public}@, declared=%{public}@, "
        "found=%{public}@",
        name, declared.qualifiedName(), found.qualifiedName());
}

void Tracker::performTime(const EventSubmit& event, Date startTime, bool submitAndRestartWithSession) {
    accessQueue_->assertCurrent("Tracker timer");
    if (scope_->timers.contains(event.name())) return;
    scope_->timers.emplace(std::string(event.name()), Timer{startTime});
    if (submitAndRestartWithSession) scope_->restartTimers.insert_or_assign(std::string(event.name()), event);
}

void Tracker::performPop(std::string_view key, DataType type) {
    accessQueue_->assertCurrent("Tracker pop");
    scope_->dataStacks.pop(key, type);
}

void Tracker::performEnterGroup(Group group) {
    accessQueue_->assertCurrent("Tracker group");
    scope_->groupStack.push_back(group);
    if (const auto delegate = delegate_.lock()) delegate->didEnterGroup(group);
}

void Tracker::performLeaveGroup() {
    for (Tracker* tracker = this; tracker; tracker = tracker->parentTracker_.get()) {
        tracker->accessQueue_->assertCurrent("Tracker group");
        if (tracker->scope_->groupStack.empty()) continue;
        const Group left = std::move(tracker->scope_->groupStack.back());
        tracker->scope_->groupStack.pop_back();
        if (const auto delegate = delegate_.lock()) delegate->didLeaveGroup(left);
        return;
    }
}

void Tracker::performWhenSession(std::function<void(AccessTracker&)> block) {
    accessQueue_->assertCurrent("Tracker whenSession");
    const auto delegate = delegate_.lock();
    if (!delegate || !block) return;
    if (delegate->activeSession()) {
        AccessTracker access(weak_from_this());
        callHost("whenSession", [&] { block(access); });
        return;
    }
    // The observation ends with its object: the host's block, which is held until it has run.
    auto waiting = std::make_shared<std::function<void(AccessTracker&)>>(std::move(block));
    const std::weak_ptr<const void> token = waiting;
    const auto observer = std::make_shared<SessionObserver>(
        AccessTracker(weak_from_this()),
        [waiting = std::move(waiting)](AccessTracker& access, SessionChange change) mutable {
            if (change != SessionChange::didStart || !waiting) return;
            const auto run = std::move(waiting);
            (*run)(access);
        });
    observer->disposeOn(token);
    delegate->addSessionObserverNow(observer);
}

/// One level per tracker, from this one to the root. A key that a nearer level supplied is not repeated under `now`.
std::vector<SnapshotLevel> Tracker::levels(SnapshotPolicy policy) {
    std::vector<SnapshotLevel> levels;
    std::set<std::string_view> taken;
    for (Tracker* tracker = this; tracker; tracker = tracker->parentTracker_.get()) {
        tracker->accessQueue_->assertCurrent("Tracker snapshot");
        SnapshotLevel level{tracker->name_, {}, tracker->scope_->timers};
        for (const auto& [key, stack] : tracker->scope_->dataStacks.all()) {
            if (stack.isEmpty()) continue;
            if (policy == SnapshotPolicy::all) {
                level.entries.emplace(key, stack.entries());
            } else if (taken.insert(key).second) {
                level.entries.emplace(key, std::vector{*stack.top()});
            }
        }
        levels.push_back(std::move(level));
    }
    return levels;
}

/// Restart timers follow the session: submitted while it can still take the event, started anew with the next one.
void Tracker::react(SessionChange change) {
    accessQueue_->assertCurrent("Tracker session change");
    if (change != SessionChange::didStart && change != SessionChange::willEnd) return;
    const auto timers = scope_->restartTimers;  // reactions change the map
    for (const auto& [name, event] : timers) {
        if (change == SessionChange::didStart) {
            performTime(event, now(), true);
        } else {
            if (!isUntimed(event)) performSubmit(event, now());
            scope_->restartTimers.insert_or_assign(name, event);
        }
    }
}

}  // namespace corvane
