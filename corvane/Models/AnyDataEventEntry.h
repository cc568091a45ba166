#pragma once

#include <corvane/Models/DataEvent.h>

#include <cstdint>
#include <initializer_list>
#include <string_view>

namespace corvane {

/// How a pushed data event behaves on its stack.
enum class DataEventTrait {
    onlyOnce,  ///< it leaves the stack with the first event that finds it
    unique,    ///< it takes the place of everything on the stack
};

/// The traits of one push: `{DataEventTrait::unique}`. Order and repetition make no difference. A value.
class DataEventTraits {
  public:
    constexpr DataEventTraits() = default;
    constexpr DataEventTraits(std::initializer_list<DataEventTrait> traits) {
        for (const DataEventTrait trait : traits) bits_ |= bit(trait);
    }

    [[nodiscard]] constexpr bool contains(DataEventTrait trait) const { return (bits_ & bit(trait)) != 0; }
    friend constexpr bool operator==(DataEventTraits, DataEventTraits) = default;

  private:
    static constexpr unsigned bit(DataEventTrait trait) { return 1U << static_cast<unsigned>(trait); }
    unsigned bits_ = 0;
};

/// One entry of a stack, with the key it is filed under and where in the host's code it was pushed.
struct AnyDataEventEntry {
    std::string_view key;  ///< lives as long as the program, or as `data`
    AnyDataEvent data;
    DataEventTraits traits;
    const char* file;  ///< lives as long as the program, or as `data`
    std::uint_least32_t line;
};

}  // namespace corvane
