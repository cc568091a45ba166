#pragma once

#include <corvane/Platform/Mutex.h>

#include <cstddef>
#include <deque>
#include <set>
#include <string>
#include <vector>

namespace corvane {

/// What earlier runs left to send, by identifier and oldest first, given out a portion at a time: however much there
/// is, a new document waits behind two portions at most, and nothing but names is kept of the rest. Safe from any
/// thread.
class Backlog {
  public:
    static constexpr std::size_t portion = 32;

    void add(const std::vector<std::string>& identifiers);
    /// The next ones, which are under way from now on. None while a portion or more is.
    [[nodiscard]] std::vector<std::string> take();
    /// Whether none is under way.
    [[nodiscard]] bool isIdle();
    /// Takes all back that has not been given out. Returns it in its order.
    std::vector<std::string> takeBack();
    /// Notes that a document needs no sending (any more). Returns whether there is something to take.
    bool end(const std::string& identifier);

  private:
    [[nodiscard]] bool isReady() const CORVANE_REQUIRES(mutex_) {
        return !waiting_.empty() && underWay_.size() < portion;
    }

    Mutex mutex_;
    std::deque<std::string> waiting_ CORVANE_GUARDED_BY(mutex_);
    std::set<std::string> underWay_ CORVANE_GUARDED_BY(mutex_);
    std::set<std::string> endedBefore_ CORVANE_GUARDED_BY(mutex_);  // while others wait: an earlier run's transfers
};

}  // namespace corvane
