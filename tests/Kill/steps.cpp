// Preloaded into a host and its agent: numbers the effects that a process has outside itself, and kills it, or lets the
// call fail, at a chosen one. A step is named by program, call, kind of file and ordinal among those ("host pwrite64
// wal 3"): the number of calls is constant, while threads change their order.
//
// STEPS_ROOT   files below this directory count, and sockets that are connected to somebody
// STEPS_TRACE  each step is written to this file
// STEPS_AT     the chosen step
// STEPS_DO     "before" or "after" (SIGKILL), "half" (a write does half of it), or the number of the error
// STEPS_MARK   made when the step was reached, which is once in all processes together
// STEPS_WORLD  a file of four numbers of 64 bits, which may change at any time: how many seconds the wall clock is off;
//              1 while the disk is full; after how many steps a host is killed, and an agent (0: never)
// STEPS_DISK   instead: each effect on a file is written to this file, with its data and in order, and each line on
//              standard output, so that scripts/check-power can make what a disk may hold after a power cut. A record:
//              call, node, number (offset or size) and the size of what follows in a line, then that: data or a path

#include <dlfcn.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/uio.h>
#include <sys/un.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <string>
#include <string_view>

namespace {

struct Kind {
    const char* name;
    std::string_view part;  // of the path
};
// The first one that fits.
constexpr Kind kinds[] = {{"server", ""},
                          {"agent", "agent.socket"},
                          {"shm", ".db-shm"},
                          {"journal-wal", "journal.db-wal"},
                          {"journal", "journal.db"},
                          {"lock", "agent.lock"},
                          {"spool", "/spool/"},
                          {"withdrawn", "/withdrawn/"},
                          {"payload", ".upload-dropbox/"},
                          {"wal", ".db-wal"},
                          {"database", ".db"},
                          {"key", "signing-key"},
                          {"recording", ".recording"},
                          {"other", ""}};
constexpr int kindCount = sizeof kinds / sizeof *kinds, server = 0, agent = 1, sharedMemory = 2, none = -1;

// NOLINTNEXTLINE(concurrency-mt-unsafe): nobody changes the environment before main
const char* setting(const char* name) {
    return getenv(name);
}

struct World {
    std::atomic<std::int64_t> clock, isFull, hostDies, agentDies;

    static World* at(const char* path) {
        const int file = path ? static_cast<int>(syscall(SYS_openat, AT_FDCWD, path, O_RDWR | O_CLOEXEC)) : -1;
        if (file < 0) return nullptr;
        void* memory = mmap(nullptr, sizeof(World), PROT_READ | PROT_WRITE, MAP_SHARED, file, 0);
        syscall(SYS_close, file);
        return memory == MAP_FAILED ? nullptr : static_cast<World*>(memory);
    }
};

struct Plan {
    const char* root = setting("STEPS_ROOT");
    const char* trace = setting("STEPS_TRACE");
    const char* at = setting("STEPS_AT");
    const char* what = setting("STEPS_DO");
    const char* mark = setting("STEPS_MARK");
    World* world = World::at(setting("STEPS_WORLD"));
    const char* disk = setting("STEPS_DISK");
    const char* program = "host";
    Plan() {
        char path[4096] = {};
        if (readlink("/proc/self/exe", path, sizeof path - 1) > 0 && strstr(path, "corvane-transferd"))
            program = "agent";
    }
};

const Plan& plan() {
    static const Plan made;
    return made;
}

int kindOf(std::string_view path) {
    if (!plan().root || path.substr(0, strlen(plan().root)) != plan().root) return none;
    for (int kind = agent; kind < kindCount; ++kind) {
        if (path.find(kinds[kind].part) != path.npos) return kind;
    }
    return none;
}

int kindOf(int descriptor) {
    const int error = errno;
    char link[64], path[4096] = {};
    snprintf(link, sizeof link, "/proc/self/fd/%d", descriptor);
    const bool isKnown = readlink(link, path, sizeof path - 1) > 0;
    int kind = none;
    if (isKnown && strncmp(path, "socket:", 7) == 0) {
        // One of the two ends has a name, but for pairs with which threads wake one another.
        for (const auto name : {getsockname, getpeername}) {
            sockaddr_un address{};
            socklen_t size = sizeof address;
            if (name(descriptor, reinterpret_cast<sockaddr*>(&address), &size) != 0) continue;
            if (address.sun_family != AF_UNIX)
                kind = server;
            else if (size > sizeof address.sun_family)
                kind = agent;
        }
    } else if (isKnown) {
        kind = kindOf(std::string_view(path));
    }
    errno = error;
    return plan().root ? kind : none;
}

[[noreturn]] void die() {
    syscall(SYS_kill, getpid(), SIGKILL);
    for (;;) pause();
}

/// Whether this is the chosen step, for the first time in any process.
bool isChosen(const char* step) {
    if (!plan().at || strcmp(step, plan().at) != 0) return false;
    const long made = syscall(SYS_openat, AT_FDCWD, plan().mark, O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600);
    if (made >= 0) syscall(SYS_close, made);
    return made >= 0;
}

void note(const char* step) {
    if (!plan().trace) return;
    char line[160];
    const int length = snprintf(line, sizeof line, "%s\n", step);
    const long file = syscall(SYS_openat, AT_FDCWD, plan().trace, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600);
    syscall(SYS_write, file, line, length);
    syscall(SYS_close, file);
}

/// Kills this process at its step in the world; says whether the disk is full for what the step does.
bool isRefused(const char* call, int kind) {
    auto* world = plan().world;
    if (!world) return false;
    auto& deaths = *plan().program == 'h' ? world->hostDies : world->agentDies;
    if (deaths > 0 && deaths.fetch_sub(1) == 1) die();
    constexpr std::string_view growing = " write pwrite64 writev mkdir ";
    return world->isFull != 0 && kind != server && kind != agent && growing.find(call) != growing.npos;
}

/// Gives a file that was written the time of the world's clock, as a machine has one clock for both.
ssize_t dated(int file, ssize_t written) {
    const auto* world = plan().world;
    if (!world || world->clock == 0 || written < 0) return written;
    const int error = errno;
    timespec times[2]{};
    clock_gettime(CLOCK_REALTIME, times);
    times[1] = times[0];
    syscall(SYS_utimensat, file, nullptr, times, 0);
    errno = error;
    return written;
}

/// What a call is about, as far as a disk is concerned.
struct Subject {
    int file = -1;
    const char* path = nullptr;
    const char* from = nullptr;
    const void* data = nullptr;
    off64_t number = -1;
    bool isOpening = false;
};

long nodeOf(const Subject& subject, int opened) {
    const int file = subject.isOpening ? opened : subject.file;
    struct stat status {};
    const int failed = file >= 0 ? fstat(file, &status) : lstat(subject.path, &status);
    return failed != 0 ? 0 : static_cast<long>(status.st_ino);
}

/// Writes the effect down. The record of effects is locked over both: theirs is one order, in all threads and
/// processes.
template <class Act>
auto recorded(const char* call, const Subject& subject, const Act& act) -> decltype(act(false)) {
    const int trace =
        static_cast<int>(syscall(SYS_openat, AT_FDCWD, plan().disk, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600));
    while (flock(trace, LOCK_EX) != 0) continue;
    const bool isNew = subject.isOpening && nodeOf(subject, -1) == 0;
    const auto result = act(false);
    const int error = errno;
    if (result >= 0 && (!subject.isOpening || isNew)) {
        std::string more = subject.path ? subject.path : "";
        if (subject.from) more.append(1, '\0').append(subject.from);
        if (subject.data) more.assign(static_cast<const char*>(subject.data), static_cast<std::size_t>(result));
        const auto number =
            subject.data && subject.number < 0 ? lseek64(subject.file, 0, SEEK_CUR) - result : subject.number;
        const auto head = std::to_string(nodeOf(subject, static_cast<int>(result))) + ' ' + std::to_string(number);
        const auto record = std::string(call) + ' ' + head + ' ' + std::to_string(more.size()) + '\n' + more;
        syscall(SYS_write, trace, record.data(), record.size());
    }
    syscall(SYS_close, trace);
    errno = error;
    return result;
}

/// Does what `act` does, unless something else was chosen for this step. `act` is told whether to do half of it only.
template <class Act>
auto effect(std::atomic<int> (&counts)[kindCount], const char* call, int kind, const Subject& subject, const Act& act)
    -> decltype(act(false)) {
    const bool isSaid = subject.file == STDOUT_FILENO && subject.data;
    if (plan().disk && (isSaid || kind > sharedMemory)) return recorded(call, subject, act);
    if (kind == none) return act(false);
    const int error = errno;
    char step[128];
    snprintf(step, sizeof step, "%s %s %s %d", plan().program, call, kinds[kind].name, ++counts[kind]);
    note(step);
    const bool chosen = isChosen(step);
    if (isRefused(call, kind)) return errno = ENOSPC, -1;
    errno = error;
    if (!chosen) return act(false);
    const std::string_view what = plan().what;
    if (what == "before") die();
    if (what == "half") return act(true);
    if (what != "after") return errno = atoi(plan().what), -1;
    act(false);
    die();
}

}  // namespace

// The function that would have been called, and the steps of this call. Behind the act: the members of its subject.
#define STEP(call, kind, act, ...)                                                         \
    static const auto real = reinterpret_cast<decltype(&::call)>(dlsym(RTLD_NEXT, #call)); \
    static std::atomic<int> counts[kindCount];                                             \
    return effect(counts, #call, kind, Subject{__VA_ARGS__}, [&]([[maybe_unused]] bool half) { return act; })

extern "C" {

ssize_t write(int file, const void* bytes, size_t size) {
    STEP(write, kindOf(file), dated(file, real(file, bytes, half ? (size + 1) / 2 : size)), .file = file,
         .data = bytes);
}
ssize_t pwrite64(int file, const void* bytes, size_t size, off64_t offset) {
    STEP(pwrite64, kindOf(file), real(file, bytes, half ? (size + 1) / 2 : size, offset), .file = file, .data = bytes,
         .number = offset);
}
ssize_t writev(int file, const iovec* parts, int count) {
    STEP(writev, kindOf(file), real(file, parts, half ? (count + 1) / 2 : count));
}
ssize_t send(int socket, const void* bytes, size_t size, int flags) {
    STEP(send, kindOf(socket), real(socket, bytes, half ? (size + 1) / 2 : size, flags));
}
ssize_t sendto(int socket, const void* bytes, size_t size, int flags, const sockaddr* to, socklen_t length) {
    STEP(sendto, kindOf(socket), real(socket, bytes, half ? (size + 1) / 2 : size, flags, to, length));
}
ssize_t sendmsg(int socket, const msghdr* message, int flags) {
    STEP(sendmsg, kindOf(socket), real(socket, message, flags));
}
int fsync(int file) {
    STEP(fsync, kindOf(file), real(file), .file = file);
}
int fdatasync(int file) {
    STEP(fdatasync, kindOf(file), real(file), .file = file);
}
int ftruncate64(int file, off64_t size) noexcept {
    STEP(ftruncate64, kindOf(file), real(file, size), .file = file, .number = size);
}
int ftruncate(int file, off_t size) noexcept {
    STEP(ftruncate, kindOf(file), real(file, size), .file = file, .number = size);
}
int rename(const char* from, const char* to) noexcept {
    STEP(rename, kindOf(to), real(from, to), .path = to, .from = from);
}
int link(const char* from, const char* to) noexcept {
    STEP(link, kindOf(to), real(from, to), .path = to, .from = from);
}
int unlink(const char* file) noexcept {
    STEP(unlink, kindOf(file), real(file), .path = file);
}
int remove(const char* file) noexcept {
    STEP(remove, kindOf(file), real(file), .path = file);
}
int mkdir(const char* directory, mode_t mode) noexcept {
    STEP(mkdir, kindOf(directory), real(directory, mode), .path = directory);
}
int bind(int socket, const sockaddr* address, socklen_t size) noexcept {
    const bool isAgent = address->sa_family == AF_UNIX && plan().root;
    STEP(bind, isAgent ? agent : none, real(socket, address, size));
}

int clock_gettime(clockid_t clock, timespec* time) noexcept {
    static const auto real = reinterpret_cast<decltype(&::clock_gettime)>(dlsym(RTLD_NEXT, "clock_gettime"));
    const int result = real(clock, time);
    if (const auto* world = plan().world; world && clock == CLOCK_REALTIME) time->tv_sec += world->clock;
    return result;
}

// Only where it may make a file.
int open(const char* file, int flags, ...) {
    va_list more;
    va_start(more, flags);
    const auto mode = (flags & O_CREAT) != 0 ? va_arg(more, mode_t) : mode_t{};
    va_end(more);
    STEP(open, (flags & O_CREAT) != 0 ? kindOf(file) : none, real(file, flags, mode), .path = file, .isOpening = true);
}
int open64(const char* file, int flags, ...) {
    va_list more;
    va_start(more, flags);
    const auto mode = (flags & O_CREAT) != 0 ? va_arg(more, mode_t) : mode_t{};
    va_end(more);
    STEP(open64, (flags & O_CREAT) != 0 ? kindOf(file) : none, real(file, flags, mode), .path = file,
         .isOpening = true);
}

}  // extern "C"
