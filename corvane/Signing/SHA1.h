#pragma once

#include <corvane/Export.h>

#include <string>
#include <string_view>

namespace corvane {

/// The SHA-1 digest, 20 bytes. Throws `SigningError` unavailable while the process exits. Any thread.
[[nodiscard]] CORVANE_EXPORT std::string sha1Digest(std::string_view bytes);

}  // namespace corvane
