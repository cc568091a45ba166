#include <corvane/Agent/Daemon/AgentProcess.h>

#include <corvane/Platform/Error.h>

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstdio>

namespace corvane::transferd::process {

namespace {

using Clock = std::chrono::steady_clock;
constexpr auto patience = std::chrono::seconds(3);
constexpr int betweenAttempts = 5;

void replaceWithNull(int descriptor, int flags) noexcept {
    const int null = open("/dev/null", flags | O_CLOEXEC);
    if (null < 0) return;
    dup2(null, descriptor);
    if (null != descriptor) close(null);
}

rlimit raiseDescriptorLimit() noexcept {
    rlimit before{};
    if (getrlimit(RLIMIT_NOFILE, &before) != 0) return before;
    const rlimit raised{before.rlim_max, before.rlim_max};
    setrlimit(RLIMIT_NOFILE, &raised);
    return before;
}

}  // namespace

Inherited leaveEverything() noexcept {
    for (int number = 1; number < NSIG; ++number) signal(number, SIG_DFL);
    signal(SIGPIPE, SIG_IGN);
    signal(SIGCHLD, SIG_IGN);  // the programs that it runs are nobody's zombies
    signal(SIGHUP, SIG_IGN);
    signal(SIGXFSZ, SIG_IGN);  // a limit on a file's size is a disk that is full
    sigset_t none;
    sigemptyset(&none);
    sigprocmask(SIG_SETMASK, &none, nullptr);
    closefrom(STDERR_FILENO + 1);
    replaceWithNull(STDIN_FILENO, O_RDONLY);
    replaceWithNull(STDERR_FILENO, O_WRONLY);
    const int ignored = chdir("/");  // there is always a root
    static_cast<void>(ignored);
    return {umask(077), raiseDescriptorLimit()};
}

void becomeDaemon() noexcept {
    setsid();
    // The leader of a session could get a terminal again; its child cannot.
    const pid_t child = fork();
    if (child != 0) _exit(child < 0 ? 1 : 0);
}

std::optional<Descriptor> lock(const AgentDirectory& directory) {
    const auto file = directory.lockPath();
    Descriptor held(open(file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!held) throw SystemError("open " + file.string(), errno);
    const auto deadline = Clock::now() + patience;
    while (flock(held.get(), LOCK_EX | LOCK_NB) != 0) {
        if (errno != EWOULDBLOCK && errno != EINTR) throw SystemError("lock " + file.string(), errno);
        if (directory.connect() || Clock::now() >= deadline) return std::nullopt;
        poll(nullptr, 0, betweenAttempts);
    }
    // For whoever looks for the process.
    if (ftruncate(held.get(), 0) == 0) dprintf(held.get(), "%ld\n", static_cast<long>(getpid()));
    return held;
}

void report(const std::string& line) noexcept {
    const std::string text = line + "\n";
    const ssize_t ignored = write(STDOUT_FILENO, text.data(), text.size());
    static_cast<void>(ignored);
    replaceWithNull(STDOUT_FILENO, O_WRONLY);
}

}  // namespace corvane::transferd::process
