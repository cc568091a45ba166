#pragma once

#include <filesystem>
#include <string>
#include <string_view>

namespace corvane::test {

/// A directory of its own for one test, set as the documents directory and removed with everything
/// in it at the end.
class TemporaryDocuments {
  public:
    TemporaryDocuments();
    TemporaryDocuments(const TemporaryDocuments&) = delete;
    TemporaryDocuments& operator=(const TemporaryDocuments&) = delete;
    ~TemporaryDocuments();

    [[nodiscard]] const std::filesystem::path& path() const { return path_; }
    std::filesystem::path operator/(std::string_view name) const { return path_ / name; }

  private:
    std::filesystem::path path_;
};

/// The whole file; empty when it cannot be read.
[[nodiscard]] std::string readFile(const std::filesystem::path& file);
void writeFile(const std::filesystem::path& file, std::string_view contents);
/// The permission bits, such as 0600.
[[nodiscard]] unsigned permissions(const std::filesystem::path& file);

}  // namespace corvane::test
