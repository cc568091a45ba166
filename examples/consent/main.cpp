// Asks whether it may record, records while it may, and shows what becomes of it.
//
//     scripts/demo --consent
//
// starts it with a collector of its own. With one that runs already: consent http://127.0.0.1:8080/events

#include "../support/CommandLine.h"
#include "Display.h"

#include <poll.h>
#include <termios.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <iostream>
#include <memory>
#include <thread>

namespace consent {
namespace {

using namespace std::chrono_literals;

constexpr auto usage =
    "usage: consent [--consent yes|no] [--documents DIR] URL\n"
    "\n"
    "Records ten events a second and uploads them to URL, such as http://127.0.0.1:8080/events, unless recording is\n"
    "off. The choice is kept in DIR (corvane-consent in the current directory); each run asks, unless it is given.\n"
    "\n"
    "Keys: + on, - off, f flush, x forget, q quit; a digit waits so many seconds. Without a terminal they come from\n"
    "standard input, as in: printf 3f1x2 | consent --consent yes URL\n"
    "Exits with 0 when nothing is left to deliver, with 1 when something is, and with 2 when it was called wrongly.\n";

struct Second {
    std::int64_t number = 0;
};
struct Tick {
    EventProperty<EventData> event = required;
    EventProperty<Second> second = required;
};

volatile std::sig_atomic_t isAskedToEnd = 0;

/// Gives each key as it is pressed, as long as it lives.
class Keyboard {
  public:
    Keyboard() : isTerminal_(tcgetattr(STDIN_FILENO, &before_) == 0) {
        for (const int signal : {SIGINT, SIGTERM, SIGHUP}) std::signal(signal, [](int) { isAskedToEnd = 1; });
        termios settings = before_;
        settings.c_lflag &= ~static_cast<tcflag_t>(ICANON | ECHO);
        if (isTerminal_) tcsetattr(STDIN_FILENO, TCSANOW, &settings);
    }
    Keyboard(const Keyboard&) = delete;
    Keyboard& operator=(const Keyboard&) = delete;
    ~Keyboard() {
        if (isTerminal_) tcsetattr(STDIN_FILENO, TCSANOW, &before_);
    }
    /// 0 when none is pressed; 'q' at the end of the input, and when a signal asks for it.
    char next() {
        pollfd input{STDIN_FILENO, POLLIN, 0};
        char key = 0;
        if (isAskedToEnd != 0) return 'q';
        if (turnsToWait_ > 0) return --turnsToWait_, key;
        if (poll(&input, 1, 0) > 0 && read(STDIN_FILENO, &key, 1) <= 0) return 'q';
        if (key >= '0' && key <= '9') turnsToWait_ = (key - '0') * 10;
        return key;
    }

  private:
    termios before_{};
    const bool isTerminal_;
    int turnsToWait_ = 0;
};

/// Without an answer, as at the end of the input, there is no consent.
bool mayRecord(const std::optional<std::string>& given) {
    if (given && *given != "yes" && *given != "no") throw examples::UsageError("--consent takes yes or no");
    if (given) return *given == "yes";
    std::fputs("May this program record what happens in it, and upload it? [y/N] ", stderr);
    std::setvbuf(stdin, nullptr, _IONBF, 0);  // what follows are keys
    std::string answer;
    std::getline(std::cin, answer);
    return answer == "y" || answer == "yes";
}

void press(char key, SessionManager& sessions, UploadBatchEventProcessor& uploads,
           const std::shared_ptr<Display>& display) {
    if (key == '+' || key == '-') {
        sessions.setRecording(key == '+', [display](const AnyError* error) {
            display->say(error ? std::string("The choice holds for this run alone: ") + error->what()
                               : "The choice is kept.");
        });
    } else if (key == 'f') {
        uploads.flush();
    } else if (key == 'x') {
        sessions.forget([display](const ForgottenRecords& forgotten, const AnyError* error) {
            display->say("Forgotten: " + std::to_string(forgotten.events) + " events, in documents or not yet." +
                         (error ? std::string(" Something is left: ") + error->what() : ""));
        });
    }
}

bool record(const examples::CommandLine& line) {
    if (line.operands().size() != 1) throw examples::UsageError("exactly one URL is needed");
    DocumentsDirectory::set(line.value("--documents").value_or("corvane-consent"));
    TransferSession::setFactory(InProcessTransferSession::factory());  // it waits for its delivery
    const auto display = std::make_shared<Display>();
    Log::shared().setSink([display](LogLevel, std::string_view message) { display->say(std::string(message)); });
    const auto uploads = std::make_shared<UploadBatchEventProcessor>(
        Client{"com.example.consent", "Consent", "1.0", 1}, Endpoint{line.operands().front(), "consent"},
        UploadBatchEventConfig({.batchSize = 20, .retryDelay = 2s}));
    uploads->setDeliveryObserver([display](const DeliveryUpdate& update) { display->observe(update); });
    SessionManager sessions;
    press(mayRecord(line.value("--consent")) ? '+' : '-', sessions, *uploads, display);
    sessions.processorManager()->add(uploads);
    sessions.start(Session::Kind::userEvents());

    const auto tracker = sessions.tracker()->chain("ticks");
    Keyboard keyboard;
    std::int64_t turn = 0;
    for (char key = keyboard.next(); key != 'q'; key = keyboard.next(), ++turn) {
        press(key, sessions, *uploads, display);
        tracker->push(Second{turn / 10}, {DataEventTrait::unique});
        tracker->submit<Tick>();  // while recording is off it is counted as not accepted
        display->show(uploads->ledger(), sessions.isRecording());
        std::this_thread::sleep_for(100ms);
    }
    sessions.endSync();
    bool isWaiting = true;
    for (int tenths = 0; isWaiting && tenths < 100; ++tenths) {
        const auto next = std::chrono::steady_clock::now() + 100ms;
        uploads->waitForDelivery(next, {.onlyWhileReachable = true});
        isWaiting = std::chrono::steady_clock::now() >= next;  // it returns early when there is nothing to wait for
        display->show(uploads->ledger(), sessions.isRecording());
    }
    const Ledger ledger = uploads->ledger();
    print(ledger);
    return ledger.open.events + ledger.waiting.documents + ledger.unaccounted == 0;
}

}  // namespace
}  // namespace consent

int main(int argc, char** argv) {
    try {
        const examples::CommandLine line(argc, argv, {"--consent", "--documents"});
        if (line.wantsHelp()) return std::fputs(consent::usage, stdout) < 0;
        return consent::record(line) ? EXIT_SUCCESS : EXIT_FAILURE;
    } catch (const examples::UsageError& error) {
        std::fprintf(stderr, "consent: %s\n\n%s", error.what(), consent::usage);
        return 2;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "consent: %s\n", error.what());
        return EXIT_FAILURE;
    }
}
