#pragma once

#include <corvane/Platform/Mutex.h>
#include <corvane/Upload/DeliveryUpdate.h>

#include <atomic>
#include <list>
#include <memory>
#include <string>

namespace corvane {

/// Brings what happens to documents to the host's delivery observer, on the main queue and in order. Internal.
///
/// Held by a `DeliveryLedger`. Updates are put in line where they happen, also under the caller's locks, and `post`
/// has the main queue look at the line once those are released. Safe from any thread; no call calls the observer.
class DeliveryNews : public std::enable_shared_from_this<DeliveryNews> {
  public:
    /// Sets the observer in place of the one before, which is told no more of what waits in line for it; an empty one
    /// ends that. A call that runs on the main queue at this moment comes to its end.
    void setObserver(DeliveryObserver observer);

    /// Whether there is an observer; otherwise nothing is put in line.
    [[nodiscard]] const std::atomic<bool>& isWanted() const { return isWanted_; }

    /// Puts an update in line. Progress takes the place of the document's progress that still waits there: a host that
    /// is busy finds one report and no heap of them. Throws `std::bad_alloc`.
    void add(DeliveryUpdate update);
    /// Notes that there was no memory for an update, for `post` to log.
    void addLoss() noexcept;
    /// Has the main queue tell of what was put in line since the last call. Requires: no lock is held.
    void post() noexcept;

  private:
    void deliver();
    /// The document's progress that waits in line, if any.
    [[nodiscard]] DeliveryUpdate* waitingProgress(const std::string& document) CORVANE_REQUIRES(mutex_);

    std::atomic<bool> isWanted_ = false;

    Mutex mutex_;
    std::shared_ptr<const DeliveryObserver> observer_ CORVANE_GUARDED_BY(mutex_);
    std::list<DeliveryUpdate> line_ CORVANE_GUARDED_BY(mutex_);  // empty without an observer
    bool isDue_ CORVANE_GUARDED_BY(mutex_) = false;              // something was put in line since the last `post`
    bool isLost_ CORVANE_GUARDED_BY(mutex_) = false;
};

}  // namespace corvane
