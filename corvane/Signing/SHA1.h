#pragma once

#include <string>
#include <string_view>

namespace corvane {

/// The SHA-1 digest, 20 bytes. Throws `SigningError` unavailable while the process exits. Any thread.
[[nodiscard]] std::string sha1Digest(std::string_view bytes);

}  // namespace corvane
