#include <corvane/Testing/CapturedLog.h>

#include <algorithm>
#include <chrono>

namespace corvane::test {

CapturedLog::CapturedLog() {
    Log::shared().setLevel(LogLevel::debug);
    Log::shared().setSink([state = state_](LogLevel level, std::string_view message) {
        std::lock_guard lock(state->mutex);
        state->lines.push_back({level, std::string(message)});
        state->changed.notify_all();
    });
}

CapturedLog::~CapturedLog() {
    Log::shared().setSink(nullptr);
    Log::shared().setLevel(LogLevel::error);
}

std::vector<CapturedLog::Line> CapturedLog::lines() const {
    std::lock_guard lock(state_->mutex);
    return state_->lines;
}

int CapturedLog::count(std::string_view text) const {
    const auto all = lines();
    return static_cast<int>(std::count_if(
        all.begin(), all.end(), [&](const Line& line) { return line.message.find(text) != std::string::npos; }));
}

bool CapturedLog::has(LogLevel level, std::string_view message) const {
    const auto all = lines();
    return std::any_of(all.begin(), all.end(),
                       [&](const Line& line) { return line.level == level && line.message == message; });
}

bool CapturedLog::waitFor(std::string_view text) const {
    std::unique_lock lock(state_->mutex);
    return state_->changed.wait_for(lock, std::chrono::seconds(10), [&] {
        return std::any_of(state_->lines.begin(), state_->lines.end(),
                           [&](const Line& line) { return line.message.find(text) != std::string::npos; });
    });
}

}  // namespace corvane::test
