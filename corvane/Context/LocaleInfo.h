#pragma once

#include <corvane/Export.h>

#include <cstdint>
#include <optional>
#include <string>

namespace corvane {

/// Data: the language that messages are to be in, and the time zone.
struct LocaleInfo {
    std::optional<std::string> language;  ///< as in ISO 639: "de"; none for the C locale
    std::optional<std::string> region;    ///< as in ISO 3166: "AT"
    std::optional<std::string> timeZone;  ///< "Europe/Vienna"; none for one without such a name
    std::optional<std::int64_t>
        utcOffset;  ///< minutes by which the local time is ahead of UTC, at the time of the call

    /// What the environment and the system say. What they do not say is left out. Any thread; as with every reader of
    /// the environment, no other one may change it meanwhile.
    [[nodiscard]] CORVANE_EXPORT static LocaleInfo current();
};

}  // namespace corvane
