#include <corvane/Platform/DocumentsDirectory.h>

#include <corvane/Platform/Bundle.h>
#include <corvane/Platform/Error.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Platform/PrivateFile.h>
#include <corvane/Platform/RecordingSwitch.h>

#include <pwd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <utility>

namespace corvane {

namespace {

struct Choice {
    Mutex mutex;
    std::filesystem::path directory CORVANE_GUARDED_BY(mutex);
};

Choice& choice() {
    static auto& instance = *new Choice;
    return instance;
}

std::filesystem::path dataHome() {
    if (const char* home = std::getenv("XDG_DATA_HOME"); home && *home == '/') return home;
    if (const char* home = std::getenv("HOME"); home && *home == '/')
        return std::filesystem::path(home) / ".local/share";
    passwd entry{};
    passwd* found = nullptr;
    char buffer[4096];
    if (getpwuid_r(getuid(), &entry, buffer, sizeof buffer, &found) == 0 && found && found->pw_dir) {
        return std::filesystem::path(found->pw_dir) / ".local/share";
    }
    throw InvalidArgument("there is no documents directory: the user has no home and none was set");
}

std::string applicationName() {
    if (auto identifier = Bundle::main().entry(Bundle::identifierKey); identifier && !identifier->empty()) {
        return *identifier;
    }
    auto name = executablePath().filename().string();
    return name.empty() ? "corvane" : name;
}

// With its directory a power cut would take all that is synced in there later. One of which the parent cannot be read,
// or cannot be synced, serves all the same.
void syncName(const std::filesystem::path& directory) {
    try {
        syncDirectory(directory.parent_path());
    } catch (const SystemError& error) {
        Log::shared().default_("A new directory may not survive a power cut, error=%{public}@", error.what());
    }
}

bool isSpace(char c) {
    return c == ' ' || (c >= '\t' && c <= '\r');
}

}  // namespace

void DocumentsDirectory::set(std::filesystem::path directory) {
    {
        const Lock lock(choice().mutex);
        choice().directory = std::move(directory);
    }
    RecordingSwitch::leaveDirectory();
}

std::filesystem::path DocumentsDirectory::path() {
    {
        const Lock lock(choice().mutex);
        if (!choice().directory.empty()) return choice().directory;
    }
    return dataHome() / applicationName() / "Documents";
}

std::filesystem::path DocumentsDirectory::create() {
    auto directory = path();
    createPrivateDirectories(directory);
    return directory;
}

std::string DocumentsDirectory::fileNamePart(std::string_view name) {
    while (!name.empty() && isSpace(name.front())) name.remove_prefix(1);
    while (!name.empty() && isSpace(name.back())) name.remove_suffix(1);
    std::string part(name);
    std::transform(part.begin(), part.end(), part.begin(),
                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
    // A file system takes 255 bytes; the longest name made from the part adds 62
    // ("com.veskar.corvane." ...
    // ".upload-dropbox.debugging" and SQLite's suffixes).
    constexpr std::size_t longest = 190;
    if (part.empty() || part == "." || part == ".." || part.size() > longest ||
        part.find_first_of(std::string_view("/\0", 2)) != std::string::npos) {
        throw InvalidArgument(
            "the endpoint name cannot name a file: it must not be empty, \".\" or \"..\", hold a "
            "slash or NUL, or be longer than 190 bytes");
    }
    return part;
}

void createPrivateDirectories(const std::filesystem::path& directory) {
    if (directory.empty()) return;
    std::error_code ignored;
    if (std::filesystem::is_directory(directory, ignored)) return;
    createPrivateDirectories(directory.parent_path() == directory ? std::filesystem::path() : directory.parent_path());
    const bool isNew = mkdir(directory.c_str(), 0700) == 0;
    if (!isNew && errno != EEXIST) throw SystemError("create directory " + directory.string(), errno);
    if (!std::filesystem::is_directory(directory, ignored)) {
        throw SystemError("create directory " + directory.string(), ENOTDIR);
    }
    if (isNew) syncName(directory);
}

}  // namespace corvane
