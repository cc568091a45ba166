#pragma once

#include <chrono>
#include <cstdint>
#include <string>

namespace replay {

/// Tells whoever waits how far the work is, on standard error: nothing in the first second, then one line that is
/// written over on a terminal, and a line every ten seconds elsewhere. Belongs to one thread.
class Progress {
  public:
    /// @param bytesInAll the size of the log; 0 when it is not known
    explicit Progress(std::int64_t bytesInAll);
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;
    ~Progress();

    /// Cheap enough to be called for every line.
    void reading(std::int64_t lines, std::int64_t bytes);
    void waiting(std::int64_t delivered, std::int64_t pending);

  private:
    [[nodiscard]] bool isDue();
    void show(const std::string& text);

    const std::int64_t bytesInAll_;
    const bool isTerminal_;
    const std::chrono::steady_clock::time_point started_;
    std::chrono::steady_clock::time_point nextTime_;
    bool hasShown_ = false;
};

}  // namespace replay
