#pragma once

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

namespace collector {

/// What happened of late, for those who watch: the latest messages, bounded in number and in bytes.
///
/// Publishing never waits for a viewer. A viewer keeps a number, the last message that it has, and asks for the next
/// one; nothing is queued for it here, so one that does not read costs nothing, and finds itself overtaken. Safe from
/// any thread.
class Hub {
  public:
    static constexpr std::size_t mostMessages = 500;
    static constexpr std::size_t mostBytes = std::size_t{16} << 20;

    struct Message {
        std::uint64_t number;
        std::shared_ptr<const std::string> text;
    };

    /// The latest stays, however large; older ones make room for it.
    void publish(std::string text);

    /// The number to begin behind for all that is kept.
    [[nodiscard]] std::uint64_t beforeOldest() const;
    /// The number of the latest message; 0 when there was none.
    [[nodiscard]] std::uint64_t latest() const;
    /// The message behind `number`, or the oldest that is kept when the viewer was overtaken: then its number is not
    /// the next one. Waits for it; nothing after `timeout`, and at once when the hub is closed.
    [[nodiscard]] std::optional<Message> next(std::uint64_t number, std::chrono::milliseconds timeout) const;

    /// Nobody waits any more.
    void close();
    [[nodiscard]] bool isClosed() const;

  private:
    mutable std::mutex mutex_;
    mutable std::condition_variable changed_;
    // Guarded by mutex_.
    std::deque<Message> messages_;
    std::uint64_t latest_ = 0;
    std::size_t bytes_ = 0;
    bool isClosed_ = false;
};

}  // namespace collector
