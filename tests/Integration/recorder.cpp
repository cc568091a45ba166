// A host application in a process of its own, for tests that kill it or let it exit.
//
//   recorder URL DIRECTORY BATCH EVENTS MODE [ENDPOINT AGENT [WAKE...]]
//
// AGENT is the program of a transfer agent, without which transfers run inside the process, and WAKE the command that
// it runs for this host.
//
// Records EVENTS events and writes the identifier of each acknowledged one to standard output, from its completion.
// MODE says what happens then: "kill" (SIGKILL in the last completion), "handOver" (SIGKILL as soon as every document
// was handed over), "exit" (main returns at once), "quit"
// (std::exit with the session manager alive), "wait" (the session ends, and what was handed over is waited for),
// "static" (static objects are the host's last users of the library), "fork" (children made in the midst of the events
// end in every way that they may; then as "wait").

#include "tests/Integration/Application.h"

#include <corvane/Agent/Host/BackgroundTransferSession.h>
#include <corvane/Transfer/InProcessTransferSession.h>

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <string>
#include <vector>

using namespace corvane;
using namespace corvane::test;

namespace {

/// Destroyed with the host's static objects, after main and between the library's exit handlers.
struct StaticHost {
    ~StaticHost() {
        if (!application) return;
        const auto tracker = application->sessions.tracker()->chain("static");
        tracker->submit<ScreenView>(acknowledge);
        application->sessions.endSync();
        application.reset();
        tracker->submit<ScreenView>(acknowledge);
    }
    std::unique_ptr<Application> application;
} staticHost;

/// Forks `count` children, which end in turns with _exit, exit and exec, and returns how many did so cleanly.
int forkChildren(int count) {
    int clean = 0;
    for (int i = 0; i < count; ++i) {
        const pid_t child = fork();
        if (child == 0) {
            alarm(20);  // one that hangs is killed, and counts as not clean
            if (i % 3 == 0) _exit(0);
            if (i % 3 == 1) std::exit(0);
            execl("/bin/true", "true", nullptr);
            _exit(127);
        }
        int status = 0;
        waitpid(child, &status, 0);
        clean += WIFEXITED(status) && WEXITSTATUS(status) == 0;
    }
    return clean;
}

TransferSession::Factory background(const std::string& directory, int count, char** command) {
    TransferAgentOptions options;
    options.program = command[0];
    options.directory = directory + "/agent";
    options.idleTime = 20s;
    options.wakeCommand.assign(command + 1, command + count);
    return BackgroundTransferSession::factory(options);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc < 6) return 2;
    const std::string mode = argv[5];
    const int events = std::atoi(argv[4]);
    DocumentsDirectory::set(argv[2]);
    TransferSession::setFactory(argc > 7 ? background(argv[2], argc - 7, argv + 7)
                                         : InProcessTransferSession::factory());
    Log::shared().setSink([](LogLevel, std::string_view) {});
    staticHost.application = std::make_unique<Application>(argv[1], std::atoi(argv[3]), argc > 6 ? argv[6] : "main");
    Application& application = *staticHost.application;
    for (int i = 1; i <= events; ++i) {
        application.sessions.tracker()->submit<ScreenView>([=](const EventSubmitResult& result) {
            acknowledge(result);
            if (i == events && mode == "kill") kill(getpid(), SIGKILL);
        });
    }
    if (mode == "kill") pause();
    if (mode == "quit") {
        static const Application* const alive = staticHost.application.release();
        std::exit(alive ? 0 : 1);
    }
    if (mode == "static") return 0;
    bool forked = true;
    if (mode == "fork") forked = forkChildren(30) == 30;
    if (mode == "fork" || mode == "wait" || mode == "handOver") {
        application.sessions.endSync();
        if (mode == "handOver") kill(getpid(), SIGKILL);
        const auto report = application.uploads->waitForDelivery(std::chrono::steady_clock::now() + 60s);
        staticHost.application.reset();
        return forked && report.pending.documents == 0 && report.givenUp.documents == 0 ? 0 : 1;
    }
    staticHost.application.reset();
    return 0;
}
