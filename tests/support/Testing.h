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
}
