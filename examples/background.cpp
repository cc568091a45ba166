// Uploads that outlive their program, and the wake-up that follows.
//
//     collector --port 8080 &
//     background http://127.0.0.1:8080/events
//
// The program records a few events, hands them over and ends at once. The transfer agent sends them, and when it has
// the answers it runs the program again, in the role of the woken application: that run learns what became of the
// documents, cleans up behind them and writes what it saw to DIRECTORY/woken.txt.

#include <corvane/corvane.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <fstream>
#include <future>
#include <memory>
#include <string>

using namespace corvane;
using namespace std::chrono_literals;

namespace {

struct Screen {
    std::string name;
};

struct ScreenView {
    EventProperty<EventData> event = required;
    EventProperty<Screen> screen = required;
};

constexpr auto usage =
    "usage: background URL [DIRECTORY]\n"
    "\n"
    "Records three events, hands them to the transfer agent for URL, such as http://127.0.0.1:8080/events, and ends.\n"
    "The agent runs the program again when they are through; that run writes DIRECTORY/woken.txt (default:\n"
    "corvane-background in the current directory).\n";

/// What both runs have in common: the same application, endpoint and directory, so that the second one's tasks are the
/// first one's.
struct Application {
    Application(const std::string& url, const std::filesystem::path& directory) {
        DocumentsDirectory::set(directory);
        TransferAgentOptions options;
        options.idleTime = 1s;
        // The agent appends the identifier of the session that has events.
        options.wakeCommand = {executable(), "--woken", url, directory.string()};
        TransferSession::setFactory(BackgroundTransferSession::factory(options));
        uploads = std::make_shared<UploadBatchEventProcessor>(Client{"com.example.background", "Background", "1.0", 1},
                                                              Endpoint{url, "main"});
        sessions.processorManager()->add(uploads);
    }

    static std::string executable() { return std::filesystem::read_symlink("/proc/self/exe").string(); }

    std::shared_ptr<UploadBatchEventProcessor> uploads;
    SessionManager sessions;
};

int record(const std::string& url, const std::filesystem::path& directory) {
    Application application(url, directory);
    application.sessions.start(Session::Kind::userEvents());
    application.sessions.tracker()->push(Screen{"home"});
    for (int i = 0; i < 3; ++i) application.sessions.tracker()->submit<ScreenView>();
    application.sessions.endSync();  // the document is the agent's now
    std::puts("3 events handed over");
    return EXIT_SUCCESS;
}

// What an application does that was woken: it hands the wake-up on, and may be suspended again, or end, when the
// completion is called.
int resume(const std::string& url, const std::filesystem::path& directory, const std::string& identifier) {
    Application application(url, directory);
    application.sessions.start(Session::Kind::userEvents());  // opens the books of what is under way
    auto delivered = std::make_shared<std::promise<void>>();
    auto all = delivered->get_future();
    application.sessions.processorManager()->resumeBackgroundProcessing(identifier,
                                                                        [delivered] { delivered->set_value(); });
    const bool came = all.wait_for(30s) == std::future_status::ready;
    application.sessions.endSync();
    const auto report = application.uploads->waitForDelivery(std::chrono::steady_clock::now());
    std::ofstream(directory / "woken.txt")
        << identifier << ": " << (came ? "all events delivered, " : "no signal, ") << report.delivered.documents
        << " documents delivered, " << report.pending.documents << " pending\n";
    return came ? EXIT_SUCCESS : EXIT_FAILURE;
}

}  // namespace

int main(int argc, char** argv) {
    try {
        if (argc == 5 && std::string(argv[1]) == "--woken") return resume(argv[2], argv[3], argv[4]);
        if (argc < 2 || argc > 3 || argv[1][0] == '-') {
            std::fputs(usage, stderr);
            return 2;
        }
        return record(argv[1], std::filesystem::absolute(argc == 3 ? argv[2] : "corvane-background"));
    } catch (const std::exception& error) {
        std::fprintf(stderr, "background: %s\n", error.what());
        return EXIT_FAILURE;
    }
}
