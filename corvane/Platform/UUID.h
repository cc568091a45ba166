#pragma once

#include <corvane/Export.h>

#include <string>

namespace corvane {

/// A new random UUID in its upper-case text form of 36 characters. Callable from any thread.
[[nodiscard]] CORVANE_EXPORT std::string newUUID();

}  // namespace corvane
