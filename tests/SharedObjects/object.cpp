// A shared object with types of its own: built several times, with types of the same names that differ. Each records
// with whatever copy of the library it is linked with, and answers with what came of it.
#include <corvane/corvane.h>

#include <cstring>

using namespace corvane;

#if CORVANE_OBJECT == 1
struct Screen {
    std::string name = "home";
    int depth = 1;
};
struct ScreenView {
    EventProperty<Screen> screen = EventProperty<Screen>::required;
    EventProperty<EventData> event = required;
};
#elif CORVANE_OBJECT == 2
struct Screen {
    int width = 640;
    int height = 480;
    std::vector<int> layers{1, 2, 3};
    std::optional<std::string> title = "main";
};
struct ScreenView {
    EventProperty<EventData> identity = required;
    EventProperty<TimedData> shown = required;
    EventProperty<Screen> display = required;
};
#endif

namespace {

class Recording final : public EventProcessorType {
  public:
    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {}
    void process(const ProcessEvent& event) override {
        std::string without;  // what differs from run to run: the identity and the span
        const auto properties = *event.json().object();
        for (const auto& [name, value] : properties) {
            without += name + "=" + (value["eventID"].exists() || value["duration"].exists() ? "" : value.text()) + " ";
        }
        text += without;
    }
    std::string text;
};

std::string recorded() {
    SessionManager sessions;
    const auto recording = std::make_shared<Recording>();
    sessions.processorManager()->add(recording);
    sessions.processorManager()->add(std::make_shared<LoggingEventProcessor>());
    sessions.start(Session::Kind::userEvents());
    sessions.push(SessionData{"screen", Screen{}});
    const auto tracker = sessions.tracker()->chain("object");
    tracker->time<ScreenView>();
    tracker->push(decode<Screen>(toDict(Screen{})));
    tracker->push(Screen{});
    tracker->pop<Screen>();
    tracker->submit<ScreenView>([&](const EventSubmitResult& result) {
        if (!result.succeeded()) recording->text += result.error()->what();
    });
    const auto view = tracker->snapshot(SnapshotPolicy::now)->evaluate<ScreenView>();
    for (const auto& entry : view.entries) recording->text += "(" + entry.name + ") ";
    tracker->transaction([](AccessTracker& access) { access.pop<Screen>(), access.submit<ScreenView>(); });
    sessions.endSync();
    return recording->text;
}

}  // namespace

/// Writes what was recorded to `text`.
extern "C" [[gnu::visibility("default")]] void record(char* text, std::size_t size) {
    std::strncpy(text, recorded().c_str(), size - 1);
}
