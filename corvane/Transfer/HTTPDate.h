#pragma once

#include <corvane/Platform/Date.h>

#include <optional>
#include <string>

namespace corvane {

/// The date of an HTTP header, in any of the forms that HTTP has had; the last one that there is for one beyond it, and
/// nothing for what is none. Internal.
[[nodiscard]] std::optional<Date> dateFromHTTP(const std::string& text);

}  // namespace corvane
