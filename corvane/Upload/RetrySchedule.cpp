#include <corvane/Upload/RetrySchedule.h>

#include <algorithm>
#include <cstdint>

namespace corvane {

namespace {
// What is longer is as good as never, and its sums fit.
constexpr std::chrono::milliseconds never = std::chrono::years(10);
}  // namespace

RetrySchedule::RetrySchedule(std::chrono::milliseconds firstDelay, double chance)
    : firstDelay_(std::min(firstDelay, never)), delay_(firstDelay_), chance_(chance) {}

std::chrono::nanoseconds RetrySchedule::spread(std::chrono::nanoseconds wait) const {
    const double quarter = static_cast<double>(wait.count()) / 4;
    return wait + std::chrono::nanoseconds(static_cast<std::int64_t>(quarter * chance_));
}

void RetrySchedule::plan(Time now) {
    if (!planned_) planned_ = now + spread(delay_);
}

void RetrySchedule::succeed(Time now) {
    delay_ = firstDelay_;
    if (planned_) planned_ = std::min(*planned_, now + spread(delay_));
}

void RetrySchedule::begin(double chance) {
    planned_.reset();
    chance_ = chance;
}

void RetrySchedule::fail() {
    delay_ = std::max(firstDelay_, std::min<std::chrono::nanoseconds>(2 * delay_, longestDelay));
}

void RetrySchedule::hold(Time now, std::chrono::seconds time) {
    heldUntil_ = std::max(heldUntil_, now + spread(time));
}

std::optional<RetrySchedule::Time> RetrySchedule::due() const {
    return planned_ ? std::optional(std::max(*planned_, heldUntil_)) : std::nullopt;
}

}  // namespace corvane
