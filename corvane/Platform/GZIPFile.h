#pragma once

#include <filesystem>

namespace corvane {

/// Whether a file that should hold something in gzip form does not, by its length and its checksum: a power cut leaves
/// names whose contents were never written, or in part. Of one that is missing or cannot be read at the moment nobody
/// can say so, and it is none. Unpacks it, and keeps nothing. Any thread.
[[nodiscard]] bool isDamagedGZIPFile(const std::filesystem::path& file) noexcept;

}  // namespace corvane
