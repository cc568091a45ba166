#include <corvane/Agent/Daemon/DirectoryWatch.h>

#include <sys/inotify.h>
#include <unistd.h>

#include <cstring>

namespace corvane::transferd {

DirectoryWatch::DirectoryWatch(const AgentDirectory& directory) : watch_(inotify_init1(IN_CLOEXEC | IN_NONBLOCK)) {
    const auto events = IN_MOVED_TO | IN_CREATE | IN_DELETE_SELF | IN_ONLYDIR;
    for (const auto& path : {directory.spoolPath(), directory.withdrawnPath()}) {
        inotify_add_watch(watch_.get(), path.c_str(), events);
    }
}

bool DirectoryWatch::take() {
    alignas(inotify_event) char buffer[4096];
    bool isThere = true;
    ssize_t count = 0;
    while ((count = read(watch_.get(), buffer, sizeof buffer)) > 0) {
        for (ssize_t at = 0; at < count;) {
            inotify_event event{};
            std::memcpy(&event, buffer + at, sizeof event);
            if (event.mask & IN_DELETE_SELF) isThere = false;
            at += static_cast<ssize_t>(sizeof event + event.len);
        }
    }
    return isThere;
}

}  // namespace corvane::transferd
