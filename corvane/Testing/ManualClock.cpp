#include <corvane/Testing/ManualClock.h>

#include <corvane/Platform/TestClock.h>
#include <corvane/Testing/RecordingProcessor.h>

namespace corvane::test {

ManualClock::ManualClock(Date date) {
    set(date);
}

ManualClock::~ManualClock() {
    detail::setWallClock(std::nullopt);
}

void ManualClock::set(Date date) {
    detail::setWallClock(date);
}

void ManualClock::advance(std::chrono::nanoseconds time) {
    set(now() + std::chrono::duration_cast<Date::duration>(time));
    detail::advanceBootClock(time);
}

void ManualClock::advance(std::chrono::nanoseconds time, const RecordingProcessor& recording) {
    recording.settle();
    advance(time);
    // A timer may be behind what was enqueued when its time had come, and set another one.
    for (int i = 0; i < 3; ++i) recording.settleByWorker();
}

}  // namespace corvane::test
