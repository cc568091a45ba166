#include <corvane/Tracker/SessionObserver.h>

#include <corvane/Platform/HostCall.h>

#include <utility>

namespace corvane {

SessionObserver::SessionObserver(AccessTracker sessionChangeTracker, Block block)
    : sessionChangeTracker_(std::move(sessionChangeTracker)), block_(std::move(block)) {}
SessionObserver::~SessionObserver() = default;

void SessionObserver::disposeOn(std::weak_ptr<const void> object) {
    const Lock lock(mutex_);
    // Whether a dead observer has been dropped yet depends on other registrations: it may not come back to life.
    if (!object_ || !object_->expired()) object_ = std::move(object);
}

std::shared_ptr<const void> SessionObserver::object() const {
    const Lock lock(mutex_);
    return object_ ? object_->lock() : nullptr;
}

bool SessionObserver::isOwnedBy(const std::weak_ptr<const void>& object) const {
    const Lock lock(mutex_);
    return object_ && !object_->owner_before(object) && !object.owner_before(*object_);
}

void SessionObserver::notify(SessionChange change) {
    const auto held = object();
    if (held && block_) callHost("session observer", [&] { block_(sessionChangeTracker_, change); });
}

}  // namespace corvane
