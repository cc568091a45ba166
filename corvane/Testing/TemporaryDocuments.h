#pragma once

#include <filesystem>
#include <string>
#include <string_view>

namespace corvane::test {

/// A directory of its own for one test, set as the documents directory and removed with everything in it at the end,
/// when the default documents directory comes back. It lies where the system keeps temporary files, and only its user
/// may read it. One at a time in a process; make it before the library's objects, which keep the directory that they
/// found, and let it go after them. The constructor throws `std::runtime_error` when no directory can be made.
class TemporaryDocuments {
  public:
    TemporaryDocuments();
    TemporaryDocuments(const TemporaryDocuments&) = delete;
    TemporaryDocuments& operator=(const TemporaryDocuments&) = delete;
    ~TemporaryDocuments();

    [[nodiscard]] const std::filesystem::path& path() const { return path_; }
    /// A file or directory in it.
    [[nodiscard]] std::filesystem::path operator/(std::string_view name) const { return path_ / name; }

  private:
    std::filesystem::path path_;
};

}  // namespace corvane::test
