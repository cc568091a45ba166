#pragma once

#include <filesystem>

namespace corvane {

/// Whether a file holds something in gzip form from its beginning to its end, as its own checksum says: a power cut
/// leaves names whose contents were never written, or in part. One that cannot be read is not whole. Unpacks it, and
/// keeps nothing. Any thread.
[[nodiscard]] bool isWholeGZIPFile(const std::filesystem::path& file) noexcept;

}  // namespace corvane
