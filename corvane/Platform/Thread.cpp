#include <corvane/Platform/Thread.h>

#include <pthread.h>
#include <signal.h>
#include <sys/resource.h>
#include <unistd.h>

#include <new>
#include <string>
#include <thread>
#include <utility>

namespace corvane {

namespace {
constexpr int backgroundNice = 5;

// The system shows 15 characters, so the common prefix of the library's labels would be all one
// sees.
std::string threadName(std::string_view label) {
    constexpr std::string_view prefix = "com.veskar.corvane.";
    if (label.starts_with(prefix)) label.remove_prefix(prefix.size());
    return std::string(label.substr(0, 15));
}
}  // namespace

SignalsBlocked::SignalsBlocked() {
    static_assert(sizeof(sigset_t) <= sizeof(previous_));
    sigset_t all;
    sigfillset(&all);
    pthread_sigmask(SIG_SETMASK, &all, ::new (previous_) sigset_t);
}

SignalsBlocked::~SignalsBlocked() {
    pthread_sigmask(SIG_SETMASK, std::launder(reinterpret_cast<sigset_t*>(previous_)), nullptr);
}

void prepareThread(std::string_view label, bool background) {
    pthread_setname_np(pthread_self(), threadName(label).c_str());
    // On Linux the priority is the thread's own. A refusal changes nothing but the priority.
    if (background) (void)setpriority(PRIO_PROCESS, static_cast<id_t>(gettid()), backgroundNice);
}

void startDetachedThread(std::string_view label, bool background, Task body) {
    SignalsBlocked blocked;
    std::thread([name = std::string(label), background, work = std::move(body)]() mutable {
        prepareThread(name, background);
        work();
    }).detach();
}

}  // namespace corvane
