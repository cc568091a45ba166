#pragma once

// What nearly every test needs.

#include <corvane/Testing/CapturedLog.h>
#include <corvane/Testing/ScriptedServer.h>
#include <corvane/Testing/TemporaryDocuments.h>

#include "tests/support/Files.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdlib>
#include <functional>
#include <future>
#include <limits>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <thread>
#include <utility>
#include <vector>

namespace corvane::test {
using namespace std::chrono_literals;

/// Waits until a condition holds that nothing signals; false when it does not within the time.
[[nodiscard]] inline bool eventually(const std::function<bool()>& condition, std::chrono::milliseconds time = 10s) {
    const auto deadline = std::chrono::steady_clock::now() + time;
    while (!condition()) {
        if (std::chrono::steady_clock::now() >= deadline) return false;
        std::this_thread::sleep_for(2ms);
    }
    return true;
}
}  // namespace corvane::test
