#include <corvane/Agent/AgentDirectory.h>

#include <corvane/Agent/TransferSubmission.h>
#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Error.h>

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <utility>

namespace corvane {

namespace {

constexpr const char* socketName = "agent.socket";

void requireOwn(const std::filesystem::path& directory) {
    struct stat status {};
    if (lstat(directory.c_str(), &status) != 0) throw SystemError("look at " + directory.string(), errno);
    if (!S_ISDIR(status.st_mode) || status.st_uid != geteuid()) {
        throw InvalidArgument("not a directory of this user: " + directory.string());
    }
    if ((status.st_mode & 07777) != 0700 && chmod(directory.c_str(), 0700) != 0) {
        throw SystemError("make private " + directory.string(), errno);
    }
}

// An address has room for 107 bytes; the way over the open directory is short whatever the directory is called.
sockaddr_un addressIn(int directory) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    std::snprintf(address.sun_path, sizeof address.sun_path, "/proc/self/fd/%d/%s", directory, socketName);
    return address;
}

const sockaddr* plain(const sockaddr_un& address) {
    return reinterpret_cast<const sockaddr*>(&address);
}

Descriptor openDirectory(const std::filesystem::path& path) {
    return Descriptor(::open(path.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
}

Descriptor newSocket() {
    return Descriptor(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
}

std::vector<std::string> tokensIn(const std::filesystem::path& directory) {
    std::vector<std::string> tokens;
    std::error_code failed;
    for (std::filesystem::directory_iterator entry(directory, failed), end; !failed && entry != end;
         entry.increment(failed)) {
        auto name = entry->path().filename().string();
        if (TransferSubmission::isToken(name)) tokens.push_back(std::move(name));
    }
    std::sort(tokens.begin(), tokens.end());
    return tokens;
}

}  // namespace

AgentDirectory::AgentDirectory(const std::filesystem::path& directory) : path_(std::filesystem::absolute(directory)) {
    for (const auto& one : {path_, spoolPath(), withdrawnPath()}) {
        createPrivateDirectories(one);
        requireOwn(one);
    }
    // The journal is not opened through a symbolic link, and homes often lie behind one.
    path_ = std::filesystem::canonical(path_);
}

Descriptor AgentDirectory::connect() const {
    const Descriptor directory = openDirectory(path_);
    Descriptor socket = newSocket();
    if (!directory || !socket) return {};
    const sockaddr_un address = addressIn(directory.get());
    if (::connect(socket.get(), plain(address), sizeof address) != 0) return {};
    return socket;
}

Descriptor AgentDirectory::listen() const {
    const Descriptor directory = openDirectory(path_);
    Descriptor socket = newSocket();
    if (!directory || !socket) throw SystemError("open " + path_.string(), errno);
    const sockaddr_un address = addressIn(directory.get());
    removeSocket();
    if (::bind(socket.get(), plain(address), sizeof address) != 0 || ::listen(socket.get(), SOMAXCONN) != 0) {
        throw SystemError("listen in " + path_.string(), errno);
    }
    return socket;
}

void AgentDirectory::removeSocket() const {
    ::unlink((path_ / socketName).c_str());
}

// The mark is there before the task starts elsewhere: an agent that reads it late finds it, and one that has taken the
// submission from the spool meanwhile looks for it before every start.
bool AgentDirectory::withdraw(std::string_view token) const {
    const auto mark = withdrawnPath() / token;
    if (::rename(submissionPath(token).c_str(), mark.c_str()) == 0) return true;
    const Descriptor made(::open(mark.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
    return false;
}

bool AgentDirectory::isWithdrawn(std::string_view token) const {
    return ::access((withdrawnPath() / token).c_str(), F_OK) == 0;
}

std::vector<std::string> AgentDirectory::withdrawn() const {
    return tokensIn(withdrawnPath());
}

void AgentDirectory::removeMark(std::string_view token) const {
    ::unlink((withdrawnPath() / token).c_str());
}

std::vector<std::string> AgentDirectory::spooled() const {
    return tokensIn(spoolPath());
}

}  // namespace corvane
