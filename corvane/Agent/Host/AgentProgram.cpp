#include <corvane/Agent/Host/AgentProgram.h>

#include <corvane/Platform/Bundle.h>
#include <corvane/Platform/Error.h>

#include <dlfcn.h>
#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/stat.h>
#include <unistd.h>

#include <memory>
#include <new>
#include <string>
#include <system_error>
#include <vector>

namespace corvane {

namespace {

constexpr const char* programName = "corvane-transferd";

// Whoever can replace the program acts for the user, so only the user and the administrator may own it.
bool isTrusted(const std::filesystem::path& program) {
    struct stat status {};
    return stat(program.c_str(), &status) == 0 && S_ISREG(status.st_mode) && (status.st_mode & S_IWOTH) == 0 &&
           (status.st_uid == 0 || status.st_uid == geteuid()) && access(program.c_str(), X_OK) == 0;
}

// The file that holds this code: the shared library, or the executable that it is linked into.
std::filesystem::path ownFile() {
    Dl_info info{};
    if (dladdr(reinterpret_cast<const void*>(&isTrusted), &info) == 0 || !info.dli_fname) return {};
    std::error_code failed;
    auto file = std::filesystem::canonical(info.dli_fname, failed);
    return failed ? executablePath() : file;
}

// Nothing is open in the agent but `output`, as its standard output.
struct SpawnActions {
    posix_spawn_file_actions_t actions;
    explicit SpawnActions(int output) {
        if (posix_spawn_file_actions_init(&actions) != 0) throw std::bad_alloc();
        posix_spawn_file_actions_addopen(&actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
        // It may be a number below 3 in a host that has closed its own; the copy clears close-on-exec either way.
        posix_spawn_file_actions_adddup2(&actions, output, STDOUT_FILENO);
        posix_spawn_file_actions_addopen(&actions, STDERR_FILENO, "/dev/null", O_WRONLY, 0);
        posix_spawn_file_actions_addclosefrom_np(&actions, STDERR_FILENO + 1);
        posix_spawn_file_actions_addchdir_np(&actions, "/");
    }
    SpawnActions(const SpawnActions&) = delete;
    SpawnActions& operator=(const SpawnActions&) = delete;
    ~SpawnActions() { posix_spawn_file_actions_destroy(&actions); }
};

// In a session of its own, with no signal blocked or ignored.
struct SpawnAttributes {
    posix_spawnattr_t attributes;
    SpawnAttributes() {
        if (posix_spawnattr_init(&attributes) != 0) throw std::bad_alloc();
        sigset_t none, all;
        sigemptyset(&none);
        sigfillset(&all);
        posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETSID);
        posix_spawnattr_setsigmask(&attributes, &none);
        posix_spawnattr_setsigdefault(&attributes, &all);
    }
    SpawnAttributes(const SpawnAttributes&) = delete;
    SpawnAttributes& operator=(const SpawnAttributes&) = delete;
    ~SpawnAttributes() { posix_spawnattr_destroy(&attributes); }
};

std::vector<std::string> argumentsFor(const std::filesystem::path& program, const std::filesystem::path& directory,
                                      const TransferAgentOptions& options) {
    return {program.string(),
            "--directory",
            directory.string(),
            "--idle-ms",
            std::to_string(options.idleTime.count()),
            "--retry-ms",
            std::to_string(options.retryDelay.count()),
            "--alone-ms",
            std::to_string(options.patienceWithoutHost.count())};
}

}  // namespace

std::filesystem::path AgentProgram::find() {
    const auto beside = ownFile().parent_path();
    // A package that was moved, then the place it was configured for, then the build tree.
    for (const auto& candidate :
         {beside / CORVANE_AGENT_FROM_LIBRARY / programName, beside / CORVANE_AGENT_FROM_PROGRAM / programName,
          std::filesystem::path(CORVANE_AGENT_INSTALLED) / programName, std::filesystem::path(CORVANE_AGENT_BUILT)}) {
        std::error_code failed;
        auto program = std::filesystem::canonical(candidate, failed);
        if (!failed && isTrusted(program)) return program;
    }
    return {};
}

AgentProgram::Started AgentProgram::start(const std::filesystem::path& program, const std::filesystem::path& directory,
                                          const TransferAgentOptions& options) {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC) != 0) throw SystemError("make a pipe", errno);
    Descriptor output(ends[0]);
    const Descriptor input(ends[1]);
    fcntl(output.get(), F_SETFL, O_NONBLOCK);

    const SpawnActions files(input.get());
    const SpawnAttributes how;
    auto arguments = argumentsFor(program, directory, options);
    std::vector<char*> argv;
    argv.reserve(arguments.size() + 1);
    for (auto& argument : arguments) argv.push_back(argument.data());
    argv.push_back(nullptr);
    pid_t process = -1;
    const int failed = posix_spawn(&process, program.c_str(), &files.actions, &how.attributes, argv.data(), environ);
    if (failed != 0) throw SystemError("start " + program.string(), failed);
    return {process, std::move(output)};
}

}  // namespace corvane
