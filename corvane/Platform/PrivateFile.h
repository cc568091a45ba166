#pragma once

#include <filesystem>
#include <string>
#include <string_view>

namespace corvane {

// Files of mode 0600 that are there whole or not at all, whenever the process is killed: the contents are written to a
// file beside the target, which then takes the target's name. Safe from any thread and with several processes. They
// throw `SystemError`, and leave no file of their own behind.

/// Writes the file, in place of one of that name.
void replacePrivateFile(const std::filesystem::path& file, std::string_view contents);

/// Writes the file unless there is one of that name. Returns whether it was written; its contents then survive a power
/// cut if its name does.
bool createPrivateFile(const std::filesystem::path& file, std::string_view contents);

/// Removes from a directory what a process that was killed left half written. Files younger than an hour stay: another
/// process may be at work on them. What cannot be looked at or removed stays.
void removeAbandonedPartialFiles(const std::filesystem::path& directory) noexcept;

/// The contents of a regular file. Throws `SystemError` when it cannot be read, at once also where a pipe or a device
/// has taken its place.
[[nodiscard]] std::string readWholeFile(const std::filesystem::path& file);

}  // namespace corvane
