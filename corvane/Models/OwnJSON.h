#pragma once

#include <corvane/Models/JSON.h>

#include <string>

namespace corvane {

/// Text that needs no second look, because the library wrote it or has found it to be JSON: what every event is made
/// of, so that no event pays for a parser. Internal.
struct OwnJSON {
    [[nodiscard]] static JSON of(std::string text);
    /// Whether a value was made so.
    [[nodiscard]] static bool is(const JSON& json) noexcept;
};

}  // namespace corvane
