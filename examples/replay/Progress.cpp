#include "Progress.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>

namespace replay {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

Progress::Progress(std::int64_t bytesInAll)
    : bytesInAll_(bytesInAll),
      isTerminal_(isatty(STDERR_FILENO) == 1),
      started_(Clock::now()),
      nextTime_(started_ + 1s) {}

Progress::~Progress() {
    if (hasShown_ && isTerminal_) std::fputs("\r\x1b[K", stderr);
}

bool Progress::isDue() {
    const auto time = Clock::now();
    if (time < nextTime_) return false;
    nextTime_ = time + (isTerminal_ ? Clock::duration(200ms) : Clock::duration(10s));
    return true;
}

void Progress::reading(std::int64_t lines, std::int64_t bytes) {
    if (!isDue()) return;
    std::string text = std::to_string(lines) + " lines read";
    if (bytesInAll_ > 0) text += ", " + std::to_string(std::min<std::int64_t>(bytes * 100 / bytesInAll_, 100)) + "%";
    const auto seconds = std::chrono::duration<double>(Clock::now() - started_).count();
    show(text + ", " + std::to_string(static_cast<std::int64_t>(static_cast<double>(lines) / seconds)) + " a second");
}

void Progress::waiting(std::int64_t delivered, std::int64_t pending) {
    if (!isDue()) return;
    show("waiting for delivery: " + std::to_string(delivered) + " documents delivered, " + std::to_string(pending) +
         " pending");
}

void Progress::show(const std::string& text) {
    std::fprintf(stderr, isTerminal_ ? "\r\x1b[K%s" : "%s\n", text.c_str());
    hasShown_ = true;
}

}  // namespace replay
