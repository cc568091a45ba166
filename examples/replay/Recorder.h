#pragma once

#include "AccessLog.h"

#include <corvane/corvane.h>

#include <atomic>
#include <cstdint>
#include <memory>
#include <semaphore>

namespace replay {

/// Records log entries as events, in sessions of a bounded length, with a bounded number of submissions in flight.
/// Belongs to one thread.
class Recorder {
  public:
    explicit Recorder(const std::shared_ptr<corvane::EventProcessorType>& processor);
    Recorder(const Recorder&) = delete;
    Recorder& operator=(const Recorder&) = delete;
    ~Recorder();

    /// Submits one event; waits while too many are in flight.
    void record(AccessLogEntry entry);
    /// Waits for all submissions, and goes on in a new session: the last batch is sent.
    void startNextSession();
    /// Waits for all submissions and ends the session, which sends the last batch.
    void finish();

    /// Events that the library has taken over, and those that it could not. Exact after `finish`.
    [[nodiscard]] std::int64_t submitted() const { return submitted_.load(); }
    [[nodiscard]] std::int64_t failed() const { return failed_.load(); }

  private:
    static constexpr std::ptrdiff_t mostInFlight = 1000;
    static constexpr std::int64_t linesPerSession = 100'000;

    void completed(const corvane::EventSubmitResult& result);

    std::counting_semaphore<mostInFlight> inFlight_{mostInFlight};
    std::atomic<std::int64_t> submitted_ = 0;
    std::atomic<std::int64_t> failed_ = 0;
    std::int64_t linesInSession_ = 0;
    corvane::SessionManager sessions_;
    std::shared_ptr<corvane::Tracker> tracker_;
};

}  // namespace replay
