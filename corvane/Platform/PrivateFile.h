#pragma once

#include <corvane/Platform/Durability.h>

#include <filesystem>
#include <string>
#include <string_view>

namespace corvane {

// Files of mode 0600 that are there whole or not at all, whenever the process is killed: the contents are written to a
// file beside the target, which then takes the target's name. Safe from any thread and with several processes. They
// throw `SystemError`, and leave no file of their own behind.

/// Writes the file, in place of one of that name. Where it must survive a power cut, one leaves the earlier file or,
/// once this has returned, the new one.
void replacePrivateFile(const std::filesystem::path& file, std::string_view contents,
                        Durability durability = Durability::processKill);

/// Writes the file unless there is one of that name. Returns whether it was written; it then survives a power cut.
bool createPrivateFile(const std::filesystem::path& file, std::string_view contents);

/// Waits until a file, with its name, is on the disk. Throws `SystemError`.
void syncFile(const std::filesystem::path& file);

/// Waits until the names of a directory are on the disk. A file system that knows no such thing is no error. Throws
/// `SystemError`.
void syncDirectory(const std::filesystem::path& directory);

/// Whether a name is that of a file that is being written, or was when its process was killed.
[[nodiscard]] bool isPartialFile(std::string_view name) noexcept;

/// Removes from a directory what a process that was killed left half written. Files younger than an hour stay: another
/// process may be at work on them. What cannot be looked at or removed stays.
void removeAbandonedPartialFiles(const std::filesystem::path& directory) noexcept;

/// The contents of a regular file. Throws `SystemError` when it cannot be read, at once also where a pipe or a device
/// has taken its place.
[[nodiscard]] std::string readWholeFile(const std::filesystem::path& file);

}  // namespace corvane
