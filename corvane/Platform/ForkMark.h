#pragma once

#include <atomic>

namespace corvane {

/// Tells an object that it has come into a child process through `fork`.
///
/// The child has a copy of the object but none of the library's threads, and a lock that one of them held at that
/// moment stays locked. Whoever would wait for either, in a destructor or an exit handler, asks first. A value that is
/// set when the object is made; asking costs a load. Internal.
class ForkMark {
  public:
    ForkMark() noexcept;

    /// Whether this process was forked off after the mark was made.
    [[nodiscard]] bool isInChild() const noexcept { return generation_ != current_.load(std::memory_order_relaxed); }

    /// For the system: called in every child.
    static void countChild() noexcept;

  private:
    static std::atomic<unsigned> current_;
    unsigned generation_;
};

}  // namespace corvane
