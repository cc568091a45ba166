#include <corvane/Platform/Bundle.h>

#include <fstream>
#include <system_error>
#include <utility>

namespace corvane {

Bundle::Bundle(std::map<std::string, std::string, std::less<>> entries) : entries_(std::move(entries)) {}

Bundle Bundle::main() {
    auto file = executablePath();
    if (file.empty()) return {};
    file += ".bundle";
    return fromFile(file);
}

Bundle Bundle::fromFile(const std::filesystem::path& file) {
    std::map<std::string, std::string, std::less<>> entries;
    std::ifstream in(file);
    for (std::string line; std::getline(in, line);) {
        if (const auto equals = line.find('='); equals != std::string::npos) {
            entries.insert_or_assign(line.substr(0, equals), line.substr(equals + 1));
        }
    }
    return Bundle(std::move(entries));
}

std::optional<std::string> Bundle::entry(std::string_view key) const {
    const auto found = entries_.find(key);
    if (found == entries_.end()) return std::nullopt;
    return found->second;
}

std::filesystem::path executablePath() {
    std::error_code error;
    return std::filesystem::read_symlink("/proc/self/exe", error);
}

}  // namespace corvane
