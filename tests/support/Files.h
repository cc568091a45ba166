#pragma once

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <string_view>
#include <vector>

namespace corvane::test {

/// The whole file; empty when it cannot be read.
[[nodiscard]] inline std::string readFile(const std::filesystem::path& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

inline void writeFile(const std::filesystem::path& file, std::string_view contents) {
    std::ofstream(file, std::ios::binary) << contents;
}

/// What is in a directory; nothing when there is none.
[[nodiscard]] inline std::vector<std::filesystem::path> filesIn(const std::filesystem::path& directory) {
    std::error_code missing;
    const std::filesystem::directory_iterator found(directory, missing);
    if (missing) return {};
    return {begin(found), end(found)};
}

/// The permission bits, such as 0600.
[[nodiscard]] inline unsigned permissions(const std::filesystem::path& file) {
    return static_cast<unsigned>(std::filesystem::status(file).permissions());
}

}  // namespace corvane::test
