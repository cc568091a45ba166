#include <corvane/Bridge/CV.h>
#include <corvane/corvane.h>

#include <cstdio>
#include <future>

using namespace corvane;

struct Screen {
    std::string name;
    int depth = 0;
};

struct ScreenView {
    EventProperty<EventData> event = required;
    EventProperty<Screen> screen = required;
};

int main(int argc, char** argv) {
    if (argc > 1) DocumentsDirectory::set(argv[1]);
    Log::shared().setSink([](LogLevel, std::string_view) {});
    // The agent comes with the package; this program does not start it.
    if (!BackgroundTransferSession::isAvailable()) return 2;
    TransferSession::setFactory(InProcessTransferSession::factory());
    SessionManager sessions;
    const Endpoint endpoint{"http://127.0.0.1:1/events", "main"};  // nobody listens there
    sessions.processorManager()->add(
        std::make_shared<UploadBatchEventProcessor>(Client{"com.example.consumer", "Consumer", "1.0", 1}, endpoint));
    sessions.start(Session::Kind::userEvents());
    sessions.tracker()->push(Screen{"home"});
    std::promise<bool> outcome;
    sessions.tracker()->submit<ScreenView>(
        [&](const EventSubmitResult& result) { outcome.set_value(result.succeeded()); });
    CVTracker bridged(sessions.tracker());
    const bool pushed = bridged.pushDataEvent(std::make_shared<CVRawDataEvent>("Screen", CVDictionary{}));
    const bool succeeded = outcome.get_future().get() && pushed;
    sessions.endSync();
    std::puts(succeeded ? "consumer: recorded" : "consumer: failed");
    return succeeded ? 0 : 1;
}
