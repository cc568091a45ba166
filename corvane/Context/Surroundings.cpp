#include <corvane/Context/Surroundings.h>
#include <corvane/Platform/Descriptor.h>
#include <corvane/Platform/JSONText.h>

#include <fcntl.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <system_error>

namespace corvane::detail {

namespace {

constexpr std::size_t longestFile = std::size_t{64} * 1024, longestText = 128;

}  // namespace

std::optional<std::string> Surroundings::file(std::string_view path) const {
    // What is no file, but a pipe that nobody writes to, must not hold up the host.
    const Descriptor descriptor(::open((root / path).c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
    if (!descriptor) return std::nullopt;
    std::string text;
    std::array<char, 4096> buffer;
    while (text.size() < longestFile) {
        const ssize_t count = ::read(descriptor.get(), buffer.data(), buffer.size());
        if (count < 0 && errno == EINTR) continue;
        if (count < 0) return std::nullopt;
        if (count == 0) break;
        text.append(buffer.data(), static_cast<std::size_t>(count));
    }
    return text;
}

bool Surroundings::exists(std::string_view path) const {
    std::error_code error;
    return std::filesystem::exists(root / path, error);
}

std::optional<std::string> Surroundings::link(std::string_view path) const {
    std::error_code error;
    const auto target = std::filesystem::read_symlink(root / path, error);
    if (error) return std::nullopt;
    return target.string();
}

std::optional<std::string> Surroundings::variable(const char* name) const {
    const char* value = environment(name);
    if (!value || !*value) return std::nullopt;
    return value;
}

std::optional<std::string> contextText(std::string_view text) {
    if (text.empty() || text.size() > longestText || !jsontext::isUTF8(text)) return std::nullopt;
    return std::string(text);
}

}  // namespace corvane::detail
