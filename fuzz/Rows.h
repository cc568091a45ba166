#pragma once

#include <FuzzedDataProvider.h>

#include <corvane/Platform/Bytes.h>

#include <initializer_list>
#include <string>
#include <string_view>

namespace corvane::fuzz {

/// A value of whatever type a damaged or foreign database may hold, as SQL text; one of `usual` every now and then.
inline std::string anyLiteral(FuzzedDataProvider& in, std::initializer_list<std::string_view> usual) {
    switch (in.ConsumeIntegralInRange(0, 7)) {
        case 0:
            return "NULL";
        case 1:
            return std::to_string(in.ConsumeIntegral<std::int64_t>());
        case 2:
            return in.PickValueInArray({"9e999", "-9e999", "1e300", "0.5", "-1", "1e18", "9223372036854775807",
                                        "-9223372036854775808", "9223372036.0", "-9223372036.0"});
        case 3:
            return std::string(usual.begin()[in.ConsumeIntegralInRange<std::size_t>(0, usual.size() - 1)]);
        default: {
            std::string literal = in.ConsumeBool() ? "CAST(x'" : "(x'";
            appendHexDigits(literal, in.ConsumeRandomLengthString());
            return literal + (literal.front() == 'C' ? "' AS TEXT)" : "')");
        }
    }
}

}  // namespace corvane::fuzz
