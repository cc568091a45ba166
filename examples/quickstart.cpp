// The smallest complete program: declares a vocabulary, records one event and waits until a server has it.
//
//     collector --port 8080 &
//     quickstart http://127.0.0.1:8080/events

#include <corvane/corvane.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <memory>
#include <optional>
#include <string>

using namespace corvane;

namespace {

struct Screen {  // data: a plain aggregate
    std::string name;
    int depth = 0;
};

struct Viewer {
    std::string id;
    std::optional<std::string> plan;
};

struct ScreenView {  // an event type declares what it carries
    EventProperty<EventData> event = required;
    EventProperty<Screen> screen = required;
    EventProperty<Viewer> viewer = optional;
};

constexpr auto usage =
    "usage: quickstart URL [DIRECTORY]\n"
    "\n"
    "Records one event and uploads it to URL, such as http://127.0.0.1:8080/events. What is not delivered stays in\n"
    "DIRECTORY (default: corvane-quickstart in the current directory) and goes out with the next run.\n"
    "Exits with 0 when everything was delivered, with 1 when not, and with 2 when it was called wrongly.\n";

bool record(const std::string& url) {
    // Identifier, name and version come from the bundle file that the build writes beside the executable.
    const std::optional<Client> client = Client::fromBundle();
    if (!client) return false;  // the log says what is missing
    const Endpoint endpoint{url, "main"};
    const auto uploads = std::make_shared<UploadBatchEventProcessor>(*client, endpoint);

    SessionManager sessions;
    sessions.processorManager()->add(std::make_shared<LoggingEventProcessor>(LoggingEventProcessorFormat::json()));
    sessions.processorManager()->add(uploads);

    sessions.start(Session::Kind::userEvents());
    const auto tracker = sessions.tracker()->chain("player");
    tracker->push(Screen{"home"});
    tracker->push(Viewer{.id = "viewer-1", .plan = "family"});
    tracker->submit<ScreenView>([](const EventSubmitResult& result) {
        if (!result.succeeded()) std::fprintf(stderr, "quickstart: not recorded: %s\n", result.error()->what());
    });
    sessions.endSync();  // the batch is finished and on its way

    const auto report = uploads->waitForDelivery(std::chrono::steady_clock::now() + std::chrono::seconds(30));
    std::printf("%lld documents delivered (%lld events), %lld pending, %lld given up\n",
                static_cast<long long>(report.delivered.documents), static_cast<long long>(report.delivered.events),
                static_cast<long long>(report.pending.documents), static_cast<long long>(report.givenUp.documents));
    return report.delivered.events > 0 && report.pending.documents == 0 && report.givenUp.documents == 0;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc < 2 || argc > 3 || argv[1][0] == '-') {
        const bool asked = argc == 2 && std::string(argv[1]) == "--help";
        std::fputs(usage, asked ? stdout : stderr);
        return asked ? EXIT_SUCCESS : 2;
    }
    try {
        Log::shared().setLevel(LogLevel::debug);  // the logging processor writes at debug level
        DocumentsDirectory::set(argc == 3 ? argv[2] : "corvane-quickstart");
        // It waits for its delivery, so nothing needs to go on when it has ended.
        TransferSession::setFactory(InProcessTransferSession::factory());
        return record(argv[1]) ? EXIT_SUCCESS : EXIT_FAILURE;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "quickstart: %s\n", error.what());
        return EXIT_FAILURE;
    }
}
