// A walk through a small media application, with everything that a host asks of the library. Read the quickstart first.
//
//     player            prints what is recorded
//     player URL        also sends it to a collector, such as http://127.0.0.1:8080/events
//
// The steps stand in the order in which a viewer would take them; each says what it shows.

#include <corvane/corvane.h>

#include <chrono>
#include <cstdio>
#include <exception>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

using namespace corvane;
using namespace std::chrono_literals;

namespace {

// --- The vocabulary: data is what events talk about, event types say which of it they carry. -------------------------

enum class Plan { free, family };
std::string_view toText(Plan plan) {
    return plan == Plan::family ? "family" : "free";
}

struct Viewer {
    std::string id;
    Plan plan = Plan::free;
};
struct Screen {
    std::string name;
    int depth = 0;
};
struct Query {
    std::string text;
    int results = 0;
};
struct Album {
    std::string title;
    std::optional<int> year;
};
struct Price {
    std::string currency;
    double amount = 0;
};

struct ScreenView {
    EventProperty<EventData> event = required;
    EventProperty<Screen> screen = required;
    EventProperty<Query> query = optional;
};
struct AlbumOpened {
    EventProperty<EventData> event = required;
    EventProperty<Album> album = required;
};
struct Playback {
    EventProperty<EventData> event = required;
    EventProperty<Album> album = required;
    EventProperty<TimedData> span = required;
};
struct ForegroundTime {
    EventProperty<EventData> event = required;
    EventProperty<TimedData> span = required;
};
struct Purchase {
    EventProperty<EventData> event = required;
    EventProperty<Album> album = required;
    EventProperty<Price> price = required;
};

// Prints one line for each event: its name and how much it says.
class Brief final : public LoggingEventProcessorFormatterType {
  public:
    std::string format(const ProcessEvent& event) const override {
        const std::string group = event.groupName() ? " in " + *event.groupName() : "";
        return "  " + event.name() + group + " " + event.json().text();
    }
};

void say(const char* step) {
    std::printf("%s\n", step);
}

// --- The application. ------------------------------------------------------------------------------------------------

class Player {
  public:
    explicit Player(std::shared_ptr<UploadBatchEventProcessor> uploads) : uploads_(std::move(uploads)) {
        sessions_.processorManager()->add(
            std::make_shared<LoggingEventProcessor>(LoggingEventProcessorFormat::custom(std::make_shared<Brief>())));
        if (uploads_) sessions_.processorManager()->add(uploads_);
    }

    void run() {
        launch();
        browse();
        search();
        openAlbum();
        play();
        buy();
        wakeUp();
        comeBack();
        quit();
    }

  private:
    // A snapshot waits for everything that was asked for before, so each step's lines stand below it.
    void step(const char* name) {
        (void)app_->snapshot(SnapshotPolicy::now);
        say(name);
    }

    // Session data goes into every document. A restart timer follows the session: its event is submitted when the
    // session is about to end, and timed anew with the next one.
    void launch() {
        step("launch");
        observer_ = app_->onSessionChange([](AccessTracker&, SessionChange change) {
            if (change == SessionChange::didStart) say("  (a session has started)");
            if (change == SessionChange::didEnd) say("  (the session has ended)");
        });
        sessions_.push(SessionData{"viewer", Viewer{"v-7"}});
        app_->whenSession([](AccessTracker&) { say("  (recording is possible)"); });
        sessions_.start(Session::Kind::userEvents());
        app_->time<ForegroundTime>(true);
    }

    // What is pushed on a tracker is in scope for those below it; the nearest and newest wins.
    void browse() {
        step("browse");
        app_->push(Screen{"home"});
        app_->submit<ScreenView>();
        library_->push(Screen{"library", 1});
        library_->submit<ScreenView>();
    }

    // The query belongs to the next screen view alone.
    void search() {
        step("search");
        library_->push(Query{"preludes", 24}, {DataEventTrait::onlyOnce});
        library_->submit<ScreenView>();
        library_->submit<ScreenView>();
    }

    // A transaction does several things in one piece; a snapshot tells beforehand whether an event is complete.
    void openAlbum() {
        step("open an album");
        const auto isReady = [this] {
            return library_->snapshot(SnapshotPolicy::all)->evaluate<AlbumOpened>().missingData.size() == 1;
        };
        if (!isReady()) say("  (an album is missing so far)");
        library_->transaction([](AccessTracker& tracker) {
            tracker.push(Screen{"album", 2}, {DataEventTrait::unique});
            tracker.push(Album{"Preludes, Book 1", 1910});
            tracker.submit<AlbumOpened>();
        });
        if (isReady()) say("  (only the identity is missing, which every event gets)");
    }

    // The timed event carries how long it took; without a timer an onlyIfTimed submission does nothing.
    void play() {
        step("play for three minutes");
        library_->explicitTime<Playback>(now() - 3min);
        library_->submit<Playback>({.onlyIfTimed = true});
        library_->submit<Playback>({.onlyIfTimed = true});
    }

    // A group's events go out in a document of their own. The purchase is prepared when the button is pressed, and
    // committed when the payment went through: it carries the time of the button. The viewer's plan changes; what was
    // recorded before the change is sent with the old one.
    void buy() {
        step("buy");
        const auto checkout = library_->chain("checkout");
        checkout->enterGroup("purchase");
        checkout->push(Screen{"checkout", 3});
        checkout->submit<ScreenView>();
        checkout->submit<Purchase>([](const EventSubmitResult& result) {
            if (!result.succeeded()) std::printf("  (not recorded: %s)\n", result.error()->what());
        });
        checkout->push(Price{"EUR", 9.99});
        const auto purchase = checkout->delayedSubmit<Purchase>();
        purchase->commit();
        checkout->pop<Price>();
        checkout->leaveGroup();
        sessions_.push(SessionData{"viewer", Viewer{"v-7", Plan::family}}, {DataEventTrait::unique}, true);
    }

    // The platform woke the application for its transfers: the processors take it from here.
    void wakeUp() {
        if (!uploads_) return;
        step("be woken for finished transfers");
        sessions_.processorManager()->resumeBackgroundProcessing("com.veskar.corvane.upload-session",
                                                                 [] { say("  (all transfer events delivered)"); });
    }

    // The data on the trackers outlives the session. While the queue is suspended, calls wait their turn.
    void comeBack() {
        step("go to the background and come back");
        sessions_.endSync();
        sessions_.start(Session::Kind::custom("second visit"));
        app_->suspend();
        library_->explicitSubmit<ScreenView>(now() - 1s);
        app_->resume();
    }

    void quit() {
        step("quit");
        app_->removeSessionObservers(app_);
        sessions_.endSync();
        if (!uploads_) return;
        const auto report = uploads_->waitForDelivery(std::chrono::steady_clock::now() + 10s);
        std::printf("%lld events delivered in %lld documents\n", static_cast<long long>(report.delivered.events),
                    static_cast<long long>(report.delivered.documents));
    }

    const std::shared_ptr<UploadBatchEventProcessor> uploads_;
    SessionManager sessions_;
    const std::shared_ptr<Tracker> app_ = sessions_.tracker()->chain("app");
    const std::shared_ptr<Tracker> library_ = app_->chain("library");
    std::shared_ptr<SessionObserver> observer_;
};

}  // namespace

int main(int argc, char** argv) {
    try {
        Log::shared().setLevel(LogLevel::debug);
        Log::shared().setSink([](LogLevel level, std::string_view message) {
            if (level != LogLevel::default_) std::printf("%.*s\n", static_cast<int>(message.size()), message.data());
        });
        std::shared_ptr<UploadBatchEventProcessor> uploads;
        if (argc > 1) {
            DocumentsDirectory::set("corvane-player");
            // It waits for its delivery, so nothing needs to go on when it has ended; examples/background shows the
            // rest.
            TransferSession::setFactory(InProcessTransferSession::factory());
            uploads = std::make_shared<UploadBatchEventProcessor>(Client{"com.example.player", "Player", "2.3", 117},
                                                                  Endpoint{argv[1], "main"});
        }
        Player(uploads).run();
    } catch (const std::exception& error) {
        std::fprintf(stderr, "player: %s\n", error.what());
        return 1;
    }
}
