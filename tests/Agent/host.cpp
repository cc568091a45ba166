// A host application with background sessions in a process of its own, for tests that kill it.
//
//   background_host PROGRAM URL DIRECTORY ENDPOINT EVENTS MODE [WAKE...]
//
// Records EVENTS events, each a document of its own, and writes the identifier of each acknowledged one to standard
// output. MODE says what happens then: "kill" (SIGKILL, as soon as every document was handed over), "wait" (for every
// document to be delivered). WAKE is the command that the agent runs for this host.

#include "tests/Integration/Application.h"

#include <corvane/Agent/Host/BackgroundTransferSession.h>

#include <signal.h>
#include <unistd.h>

#include <cstdlib>
#include <string>

using namespace corvane;
using namespace corvane::test;

int main(int argc, char** argv) {
    if (argc < 7) return 2;
    const std::string mode = argv[6];
    DocumentsDirectory::set(argv[3]);
    Log::shared().setSink([](LogLevel level, std::string_view message) {
        if (level == LogLevel::error)
            dprintf(STDERR_FILENO, "%.*s\n", static_cast<int>(message.size()), message.data());
    });
    TransferAgentOptions options;
    options.program = argv[1];
    options.directory = std::string(argv[3]) + "/agent";
    options.idleTime = 20s;
    options.wakeCommand.assign(argv + 7, argv + argc);
    TransferSession::setFactory(BackgroundTransferSession::factory(options));

    Application application(argv[2], 1, argv[4]);
    for (int i = std::atoi(argv[5]); i > 0; --i) application.sessions.tracker()->submit<ScreenView>(acknowledge);
    application.sessions.endSync();
    if (mode == "kill") kill(getpid(), SIGKILL);
    const auto report = application.uploads->waitForDelivery(std::chrono::steady_clock::now() + 60s);
    return report.pending.documents == 0 && report.givenUp.documents == 0 ? 0 : 1;
}
