#pragma once

#include <corvane/Models/DataEvent.h>
#include <corvane/Models/DataEventTrait.h>

#include <cstdint>
#include <string_view>

namespace corvane {

/// One entry of a stack, with the key it is filed under and where in the host's code it was pushed.
struct AnyDataEventEntry {
    std::string_view key;  ///< lives as long as the program, or as `data`
    AnyDataEvent data;
    DataEventTraits traits;
    const char* file;  ///< lives as long as the program, or as `data`
    std::uint_least32_t line;
};

}  // namespace corvane
