// The host that scripts/check-steps kills.
//
//   kill_host URL DIRECTORY AGENT MODE ["powerCut"]
//
// AGENT is the transfer agent's program, or "-" for transfers inside the process. MODE:
//
//   leave    records 7 events in batches of 5, and waits to be killed
//   record   records 12 events, each behind the one before, ends the session, and waits until each document has an
//   outcome forget   records 7 events, forgets them, and records 3 behind that; then as "record" collect  records one
//   event; then as "record", and waits until what was to be forgotten is
//   pauses   records 7 events, waits until the disk's last moments are over, says "later", records 7 more and does the
//            same; then as "record"
//
// Writes to standard output a line for each event that was acknowledged, "before ID" or "after ID" by whether
// forgetting is to drop it, "forgotten" when that has succeeded, and at the end "unaccounted N", as the ledger has it.

#include "tests/Integration/Application.h"

#include <corvane/Agent/Host/BackgroundTransferSession.h>
#include <corvane/Platform/RecordingSwitch.h>

#include <unistd.h>

#include <cstdio>
#include <future>
#include <string>
#include <thread>

using namespace corvane;
using namespace corvane::test;

namespace {

void say(const std::string& line) {
    const auto text = line + "\n";
    if (write(STDOUT_FILENO, text.data(), text.size()) < 0) std::_Exit(3);
}

/// @param oneByOne whether each waits for the one before: those that are at hand together share a write
void submit(Application& application, int count, const std::string& when, bool oneByOne = false) {
    application.sessions.tracker()->push(Screen{when});
    for (int i = 0; i < count; ++i) {
        std::promise<void> told;
        auto wait = told.get_future();
        application.sessions.tracker()->submit<ScreenView>(
            [when, told = std::make_shared<std::promise<void>>(std::move(told))](const EventSubmitResult& result) {
                if (result.succeeded()) say(when + " " + *result.event()->json()["event"]["eventID"].string());
                told->set_value();
            });
        if (oneByOne) wait.wait();
    }
}

void forget(Application& application) {
    std::promise<void> forgotten;
    application.sessions.forget([&](const ForgottenRecords&, const AnyError* error) {
        if (!error) say("forgotten");
        forgotten.set_value();
    });
    forgotten.get_future().wait();
}

TransferSession::Factory transfers(const std::string& agent, const std::string& directory) {
    if (agent == "-") return InProcessTransferSession::factory();
    TransferAgentOptions options;
    options.program = agent;
    options.directory = directory + "/agent";
    options.idleTime = 300ms;
    options.retryDelay = 20ms;
    return BackgroundTransferSession::factory(options);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc < 5) return 2;
    const std::string mode = argv[4];
    DocumentsDirectory::set(argv[2]);
    Log::shared().setSink([](LogLevel level, std::string_view message) {
        if (level == LogLevel::error)
            dprintf(STDERR_FILENO, "%.*s\n", static_cast<int>(message.size()), message.data());
    });
    TransferSession::setFactory(transfers(argv[3], argv[2]));
    UploadBatchEventOptions options{.batchSize = 5};
    if (argc > 5) options.durability = Durability::powerCut;
    Application application(argv[1], UploadBatchEventConfig(options));
    if (mode == "record") submit(application, 12, "before", true);
    for (int i = 0; i < 2 && mode == "pauses"; ++i) {
        submit(application, 7, "before", true);
        std::this_thread::sleep_for(1200ms);
        say("later");
    }
    if (mode == "leave" || mode == "forget") submit(application, 7, "before");
    if (mode == "leave") pause();
    if (mode == "forget") {
        forget(application);
        submit(application, 3, "after");
    }
    if (mode == "collect") submit(application, 1, "after");
    application.sessions.endSync();
    application.wait();
    const auto deadline = std::chrono::steady_clock::now() + 10s;
    while (mode == "collect" && RecordingSwitch::unfinishedEpoch() != 0) {
        if (std::chrono::steady_clock::now() > deadline) return 4;
        std::this_thread::sleep_for(1ms);
    }
    say("unaccounted " + std::to_string(application.uploads->ledger().unaccounted));
    return 0;
}
