#pragma once

#include <corvane/Context/DisplayInfo.h>
#include <corvane/Context/LocaleInfo.h>
#include <corvane/Context/MachineInfo.h>
#include <corvane/Context/OperatingSystemInfo.h>
#include <corvane/Context/ProcessInfo.h>

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace corvane::detail {

/// What the context is read from: the machine's files and the environment, or a test's. Internal.
struct Surroundings {
    std::filesystem::path root = "/";
    std::function<const char*(const char*)> environment = [](const char* name) { return std::getenv(name); };

    /// What stands in a file, up to 64 KiB; nothing for what cannot be read at once.
    [[nodiscard]] std::optional<std::string> file(std::string_view path) const;
    [[nodiscard]] bool exists(std::string_view path) const;
    /// Where a symbolic link points.
    [[nodiscard]] std::optional<std::string> link(std::string_view path) const;
    /// A variable that is set to some text.
    [[nodiscard]] std::optional<std::string> variable(const char* name) const;
};

/// Text that may go into an event: UTF-8, not empty, at most 128 bytes.
[[nodiscard]] std::optional<std::string> contextText(std::string_view text);

/// @param release the kernel's own version
[[nodiscard]] OperatingSystemInfo operatingSystem(const Surroundings& around, std::string_view release);
/// @param bytes the memory that is installed
[[nodiscard]] std::optional<std::int64_t> memoryClass(std::uint64_t bytes);
/// All but the offset.
[[nodiscard]] LocaleInfo locale(const Surroundings& around);
/// @param parent the identifier of the process that has started this one
/// @param sinceBoot the time now, by a clock that counts from the start of the system
/// @param ticks so many make a second of the kernel's
[[nodiscard]] ProcessInfo process(const Surroundings& around, std::int64_t parent, Date now,
                                  std::chrono::nanoseconds sinceBoot, std::int64_t ticks);
[[nodiscard]] std::optional<DisplayInfo> display(const Surroundings& around);

}  // namespace corvane::detail
