#include <corvane/Agent/Daemon/WakeUp.h>

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

namespace corvane::transferd {

// The agent ignores the end of its children, so the system forgets them by itself.
bool runDetached(const std::vector<std::string>& command, const process::Inherited& inherited) {
    std::vector<char*> argv;
    argv.reserve(command.size() + 1);
    for (const auto& argument : command) argv.push_back(const_cast<char*>(argument.c_str()));
    argv.push_back(nullptr);

    posix_spawn_file_actions_t files;
    posix_spawnattr_t how;
    if (posix_spawn_file_actions_init(&files) != 0 || posix_spawnattr_init(&how) != 0) return false;
    posix_spawn_file_actions_addclosefrom_np(&files, STDERR_FILENO + 1);
    sigset_t none, all;
    sigemptyset(&none);
    sigfillset(&all);
    posix_spawnattr_setflags(&how, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETSID);
    posix_spawnattr_setsigmask(&how, &none);
    posix_spawnattr_setsigdefault(&how, &all);

    const mode_t mask = umask(inherited.mask);
    rlimit own{};
    if (getrlimit(RLIMIT_NOFILE, &own) == 0) setrlimit(RLIMIT_NOFILE, &inherited.descriptors);
    pid_t process = -1;
    const bool started = posix_spawn(&process, argv.front(), &files, &how, argv.data(), environ) == 0;
    setrlimit(RLIMIT_NOFILE, &own);
    umask(mask);
    posix_spawnattr_destroy(&how);
    posix_spawn_file_actions_destroy(&files);
    return started;
}

}  // namespace corvane::transferd
