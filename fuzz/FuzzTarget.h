#pragma once

#include <corvane/Platform/JSONText.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/Require.h>

#include "tests/support/AgentFiles.h"

#include <FuzzedDataProvider.h>

#include <initializer_list>
#include <string>

/// One input of a fuzz target, each of which is a program with this function. What must hold is a `CORVANE_REQUIRE`
/// there: it ends the process, and whoever runs the target has the input.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

namespace corvane::fuzz {

inline std::string_view textOf(const std::uint8_t* data, std::size_t size) {
    return {reinterpret_cast<const char*>(data), size};
}

/// A value of whatever type a damaged or foreign database may hold, as SQL text; one of `usual` every now and then.
inline std::string anyLiteral(FuzzedDataProvider& in, std::initializer_list<std::string_view> usual) {
    constexpr auto numbers = std::to_array({"9e999", "-9e999", "1e300", "0.5", "-1", "1e18", "9223372036854775807",
                                            "-9223372036854775808", "9223372036.0", "-9223372036.0", "NULL"});
    const int kind = in.ConsumeIntegralInRange(0, 7);
    if (kind == 0) return std::to_string(in.ConsumeIntegral<std::int64_t>());
    if (kind < 3) return in.PickValueInArray(numbers);
    if (kind < 5) return std::string(usual.begin()[in.ConsumeIntegralInRange<std::size_t>(0, usual.size() - 1)]);
    const std::string bytes = test::literal(in.ConsumeRandomLengthString());
    return in.ConsumeBool() ? "CAST(" + bytes + " AS TEXT)" : bytes;
}

}  // namespace corvane::fuzz
