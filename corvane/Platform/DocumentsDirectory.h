#pragma once

#include <corvane/Export.h>

#include <filesystem>
#include <optional>
#include <string>
#include <string_view>

namespace corvane {

/// Where the library keeps its databases, payload files and signing key.
///
/// Unless the host says otherwise it is "<data home>/<application>/Documents", where the data home
/// is the platform's
/// (`$XDG_DATA_HOME`, or ".local/share" in the user's home) and the application is the bundle
/// identifier or, without a bundle, the name of the executable. All operations may be called from
/// any thread.
class CORVANE_EXPORT DocumentsDirectory {
  public:
    /// Replaces the directory. Call it before the first processor is made; objects that have looked
    /// it up keep what they found.
    static void set(std::filesystem::path directory);

    /// The directory, whether it exists or not. Throws `InvalidArgument` when there is neither a
    /// directory set nor a home.
    [[nodiscard]] static std::filesystem::path path();

    /// The directory, created with mode 0700 if it is missing. Throws `SystemError` or
    /// `InvalidArgument`.
    static std::filesystem::path create();

    /// The part of file names that stands for an endpoint: `name` without leading and trailing
    /// blanks, tabs and line breaks, and with the letters A to Z as a to z. Other letters and white
    /// space stay as they are, so that a name keeps its files whatever a later version of Unicode
    /// says of it. Throws `InvalidArgument` when no file in the
    /// directory can be named so: the name is empty, holds a slash or NUL, is a relative step, or
    /// is too long for a file name.
    [[nodiscard]] static std::string fileNamePart(std::string_view name);
};

/// Creates a directory with its parents, each new one with mode 0700. Throws `SystemError`.
CORVANE_EXPORT void createPrivateDirectories(const std::filesystem::path& directory);

}  // namespace corvane
