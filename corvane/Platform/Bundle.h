#pragma once

#include <corvane/Export.h>

#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace corvane {

/// What an application says of itself: a small dictionary of text entries.
///
/// The running application's own bundle is the file "<executable>.bundle" beside its executable,
/// one "Key=value" line per entry, which the CMake function `corvane_application_bundle(target)`
/// writes. A value; read it from any thread.
class CORVANE_EXPORT Bundle {
  public:
    static constexpr std::string_view identifierKey = "BundleIdentifier";
    static constexpr std::string_view nameKey = "BundleName";
    static constexpr std::string_view shortVersionKey = "BundleShortVersionString";
    static constexpr std::string_view versionKey = "BundleVersion";

    Bundle() = default;
    explicit Bundle(std::map<std::string, std::string, std::less<>> entries);

    /// The running application's bundle; without a file it has no entries.
    [[nodiscard]] static Bundle main();
    /// Reads a bundle file. A missing or unreadable file gives no entries; lines without "=" are
    /// skipped.
    [[nodiscard]] static Bundle fromFile(const std::filesystem::path& file);

    /// The entry's text, or nothing.
    [[nodiscard]] std::optional<std::string> entry(std::string_view key) const;

  private:
    std::map<std::string, std::string, std::less<>> entries_;
};

/// The path of the running executable.
[[nodiscard]] CORVANE_EXPORT std::filesystem::path executablePath();

}  // namespace corvane
