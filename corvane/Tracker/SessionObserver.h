#pragma once

#include <corvane/Export.h>
#include <corvane/Models/Session.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Tracker/AccessTracker.h>

#include <functional>
#include <memory>
#include <optional>

namespace corvane {

/// Connects a block of the host's to session changes, for as long as an object lives.
///
/// Made by `Tracker::onSessionChange`, with the tracker as its object; shared between the host and the session manager.
/// Once its object is gone the observer is over for good: it is skipped, and dropped at a later registration.
class CORVANE_EXPORT SessionObserver {
  public:
    /// Called on the session manager's queue. What it throws is logged.
    using Block = std::function<void(AccessTracker&, SessionChange)>;

    SessionObserver(AccessTracker sessionChangeTracker, Block block);
    ~SessionObserver();

    /// Bounds the observation by the life of another object; nothing ends it. Does nothing when it is over. Any thread,
    /// before or after registration.
    void disposeOn(std::weak_ptr<const void> object);

    /// The object that bounds the observation, or nullptr. Any thread.
    [[nodiscard]] std::shared_ptr<const void> object() const;

    /// Whether `object` is what bounds the observation, or shares its ownership with it. Any thread.
    [[nodiscard]] bool isOwnedBy(const std::weak_ptr<const void>& object) const;

    /// Calls the block if the object lives. On the session manager's queue.
    void notify(SessionChange change);

  private:
    AccessTracker sessionChangeTracker_;
    const Block block_;
    mutable Mutex mutex_;
    std::optional<std::weak_ptr<const void>> object_ CORVANE_GUARDED_BY(mutex_);  // nothing until the first `disposeOn`
};

}  // namespace corvane
