#include <corvane/corvane.h>
using namespace corvane;

struct Screen { std::string name; int depth = 0; };              // data: a plain aggregate
struct Viewer { std::string id; std::optional<std::string> plan; };

struct ScreenView {                                              // an event type declares what it carries
    EventProperty<EventData> event  = required;
    EventProperty<Screen>    screen = required;
    EventProperty<Viewer>    viewer = optional;
};

int main() {
    SessionManager sessions;
    Client   client{"com.example.player", "Player", "2.3", 117};
    Endpoint endpoint{"https://collector.example.com/events", "main"};
    sessions.processorManager()->add(std::make_shared<UploadBatchEventProcessor>(client, endpoint));

    sessions.start(Session::Kind::userEvents());
    auto tracker = sessions.tracker()->chain("player");
    tracker->push(Screen{"home"});
    tracker->submit<ScreenView>([](const EventSubmitResult& result) { /* on the tracker's queue */ });
    sessions.endSync();
}
