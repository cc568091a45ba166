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

namespace {

void acknowledge(const EventSubmitResult& result) {
    if (!result.succeeded()) std::_Exit(4);
    const std::string line = *result.event()->json()["event"]["eventID"].string() + "\n";
    if (write(STDOUT_FILENO, line.data(), line.size()) < 0) std::_Exit(3);
}

}  // namespace

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

    SessionManager sessions;
    const auto uploads =
        std::make_shared<UploadBatchEventProcessor>(Client{"com.example.player", "Player", "2.3", 117},
                                                    Endpoint{argv[2], argv[4]}, UploadBatchEventConfig(1, false));
    sessions.processorManager()->add(uploads);
    sessions.start(Session::Kind::userEvents());
    sessions.tracker()->push(Screen{"home"});
    for (int i = std::atoi(argv[5]); i > 0; --i) sessions.tracker()->submit<ScreenView>(acknowledge);
    sessions.endSync();
    if (mode == "kill") kill(getpid(), SIGKILL);
    const auto report = uploads->waitForDelivery(std::chrono::steady_clock::now() + 60s);
    return report.pending.documents == 0 && report.givenUp.documents == 0 ? 0 : 1;
}
