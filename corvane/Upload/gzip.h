#pragma once

#include <string>
#include <string_view>

namespace corvane {

/// The bytes in gzip form, at the best compression. Nothing stays nothing, and what is in gzip form already comes back
/// as it is, so that compressing twice is harmless. Throws `GZIPError`, also for 4 GiB and more.
[[nodiscard]] std::string gzipCompressed(std::string_view bytes);

}  // namespace corvane
