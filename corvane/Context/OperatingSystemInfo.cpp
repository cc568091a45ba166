#include <corvane/Context/Surroundings.h>

#include <sys/utsname.h>

#include <algorithm>

namespace corvane {

namespace {

bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

// A value as a shell would read it: bare, or in quotes of either kind, with escapes.
std::string unquoted(std::string_view value) {
    char quote = 0;
    if (value.size() >= 2 && (value.front() == '"' || value.front() == '\'') && value.back() == value.front()) {
        quote = value.front();
        value = value.substr(1, value.size() - 2);
    }
    std::string text;
    for (std::size_t i = 0; i < value.size(); ++i) {
        if (value[i] == '\\' && quote != '\'' && i + 1 < value.size()) ++i;
        text += value[i];
    }
    return text;
}

std::optional<std::string> entry(std::string_view file, std::string_view key) {
    std::optional<std::string> found;  // of several the last one counts
    while (!file.empty()) {
        const auto end = std::min(file.find('\n'), file.size());
        const std::string_view line = file.substr(0, end);
        file.remove_prefix(std::min(end + 1, file.size()));
        if (line.size() > key.size() && line.starts_with(key) && line[key.size()] == '=') {
            found = unquoted(line.substr(key.size() + 1));
        }
    }
    return found ? detail::contextText(*found) : std::nullopt;
}

// The rest of a kernel's version may name a build of one machine's own.
std::optional<std::string> firstTwoNumbers(std::string_view release) {
    const char* const end = release.data() + release.size();
    const char* const dot = std::find_if_not(release.data(), end, isDigit);
    if (dot == release.data() || dot == end || *dot != '.') return std::nullopt;
    const char* const second = std::find_if_not(dot + 1, end, isDigit);
    if (second == dot + 1) return std::nullopt;
    return detail::contextText(std::string_view(release.data(), second));
}

}  // namespace

OperatingSystemInfo detail::operatingSystem(const Surroundings& around, std::string_view release) {
    auto file = around.file("etc/os-release");
    if (!file) file = around.file("usr/lib/os-release");
    const std::string_view text = file ? std::string_view(*file) : std::string_view();
    return {entry(text, "ID"), entry(text, "NAME"), entry(text, "VERSION_ID"), firstTwoNumbers(release)};
}

OperatingSystemInfo OperatingSystemInfo::current() {
    utsname names{};
    return detail::operatingSystem({}, ::uname(&names) == 0 ? names.release : "");
}

}  // namespace corvane
