#pragma once

#include <corvane/Platform/JSONText.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/Require.h>

#include <cstddef>
#include <cstdint>
#include <string_view>

/// One input of a fuzz target, each of which is a program with this function. What must hold is a `CORVANE_REQUIRE`
/// there: it ends the process, and whoever runs the target has the input.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

namespace corvane::fuzz {

inline std::string_view textOf(const std::uint8_t* data, std::size_t size) {
    return {reinterpret_cast<const char*>(data), size};
}

/// Has everything that is logged made and looked at, and nothing printed. What is told to do so at each input is done
/// once.
inline void checkLog() {
    static const bool isSet = [] {
        Log::shared().setLevel(LogLevel::debug);
        Log::shared().setSink([](LogLevel, std::string_view message) {
            CORVANE_REQUIRE(jsontext::isUTF8(message), "a message of the log is not UTF-8");
        });
        return true;
    }();
    static_cast<void>(isSet);
}

}  // namespace corvane::fuzz
