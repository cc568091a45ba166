#pragma once

#include <corvane/Platform/Date.h>

#include <chrono>

namespace corvane::test {

class RecordingProcessor;

/// The time of this process, which passes when the test says so: dates and durations in events are what the test makes
/// them, and a delay of an hour takes none.
///
/// While there is one, the library's wall clock stands still. Timers, such as those of
/// `UploadBatchEventOptions::maximumDelay`, heed what is advanced and real time too. A transfer agent, and the host's
/// own use of the system's clocks, are not affected. One at a time in a process. The destructor lets the wall clock go
/// on. Any thread.
///
///     ManualClock clock;
///     tracker->time<Play>();
///     clock.advance(std::chrono::seconds(90));
///     tracker->submit<Play>();
///     recording->only("Play").at("span.duration").integer();   // 90000
class ManualClock {
  public:
    explicit ManualClock(Date date = now());
    ManualClock(const ManualClock&) = delete;
    ManualClock& operator=(const ManualClock&) = delete;
    ~ManualClock();

    /// Lets time pass. Timers that are due then fire when their queue next has something to do.
    void advance(std::chrono::nanoseconds time);
    /// The same when what was submitted before has been processed, and returns when timers that are due then have
    /// fired. Not to be called on the recording processor's queue.
    void advance(std::chrono::nanoseconds time, const RecordingProcessor& recording);
    /// Sets the wall clock alone, as a user may, in either direction.
    void set(Date date);
};

}  // namespace corvane::test
