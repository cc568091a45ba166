#pragma once

#include <atomic>
#include <functional>
#include <utility>

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

}  // namespace corvane
