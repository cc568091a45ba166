// The host that scripts/check-steps, scripts/check-power and scripts/soak drive.
//
//   kill_host URL DIRECTORY AGENT OPTION=VALUE...
//
// AGENT is the transfer agent's program, or "-" for transfers inside the process. Does what the lines of standard input
// say, each behind the one before, and ends with the input. What ends a line's work later than the line is told of on
// standard output by a line of its own: of a submission "ack NAME EVENT" or "no NAME", of `record` "recorded", of
// `forget` "forgotten" or "not forgotten", of `wait` "waited", of `read` "ledger UNACCOUNTED". `told` waits for all of
// these.

#include "tests/Integration/Application.h"

#include <corvane/Agent/Host/BackgroundTransferSession.h>
#include <corvane/Platform/RecordingSwitch.h>

#include <unistd.h>

#include <atomic>
#include <cstdio>
#include <functional>
#include <iostream>
#include <map>
#include <sstream>
#include <string>
#include <thread>

using namespace corvane;
using namespace corvane::test;

namespace {

struct Viewer {
    std::string name;
};

std::atomic<int> untold = 0;

void say(const std::string& line) {
    const auto text = line + "\n";
    if (write(STDOUT_FILENO, text.data(), text.size()) < 0) std::_Exit(3);
}

void tell(const std::string& line) {
    say(line);
    --untold;
    untold.notify_all();
}

struct Options {
    UploadBatchEventOptions batches;
    TransferAgentOptions agent;

    Options(const std::string& directory, const std::string& program, int count, char** values) {
        agent.program = program;
        agent.directory = directory + "/agent";
        agent.idleTime = 300ms;
        agent.retryDelay = 20ms;
        for (int i = 0; i < count; ++i) {
            const std::string text = values[i];
            const auto middle = text.find('=');
            set(text.substr(0, middle), std::stoll(text.substr(middle + 1)));
        }
    }

  private:
    void set(const std::string& name, long long value) {
        const std::chrono::milliseconds time(value);
        if (name == "batchSize") batches.batchSize = static_cast<int>(value);
        if (name == "maximumBytesOnDisk") batches.maximumBytesOnDisk = value;
        if (name == "maximumAge") batches.maximumAge = time;
        if (name == "maximumDelay") batches.maximumDelay = time;
        if (name == "retryDelay") batches.retryDelay = time;
        if (name == "powerCut") batches.durability = Durability::powerCut;
        if (name == "deadline") agent.deadline = time;
        if (name == "holdOff") agent.holdOff = time;
    }
};

class Host {
  public:
    Host(const std::string& url, const UploadBatchEventOptions& options)
        : uploads_(std::make_shared<UploadBatchEventProcessor>(Client{"com.example.player", "Player", "2.3", 117},
                                                               Endpoint{url, "main"},
                                                               UploadBatchEventConfig(options))) {
        sessions_.processorManager()->add(uploads_);
    }

    void obey(const std::string& line) {
        std::istringstream words(line);
        std::string what, name;
        words >> what >> name;
        const auto found = commands_.find(what);
        if (found == commands_.end()) std::_Exit(2);
        found->second(name);
    }

  private:
    void submit(const std::string& name) {
        ++untold;
        sessions_.tracker()->push(Screen{name});
        sessions_.tracker()->submit<ScreenView>([name](const EventSubmitResult& result) {
            if (!result.succeeded()) return tell("no " + name);
            tell("ack " + name + " " + *result.event()->json()["event"]["eventID"].string());
        });
    }

    void forget() {
        ++untold;
        sessions_.forget(
            [](const ForgottenRecords&, const AnyError* error) { tell(error ? "not forgotten" : "forgotten"); });
    }

    void record(bool isOn) {
        ++untold;
        sessions_.setRecording(isOn, [](const AnyError*) { tell("recorded"); });
    }

    void wait() {
        uploads_->waitForDelivery(std::chrono::steady_clock::now() + 20s);
        const auto deadline = std::chrono::steady_clock::now() + 10s;
        while (RecordingSwitch::unfinishedEpoch() != 0 && std::chrono::steady_clock::now() < deadline) usleep(1000);
        say("waited");
    }

    void read() {
        ++untold;
        uploads_->readLedger([](const Ledger& ledger) { tell("ledger " + std::to_string(ledger.unaccounted)); });
    }

    static void waitUntilTold() {
        for (int left = untold; left > 0; left = untold) untold.wait(left);
    }

    std::shared_ptr<UploadBatchEventProcessor> uploads_;
    SessionManager sessions_;
    const std::map<std::string, std::function<void(const std::string&)>> commands_ = {
        {"start", [this](auto&) { sessions_.start(Session::Kind::userEvents()); }},
        {"end", [this](auto&) { sessions_.endSync(); }},
        {"submit", [this](auto& name) { submit(name); }},
        {"enter", [this](auto& name) { sessions_.tracker()->enterGroup(name); }},
        {"leave", [this](auto&) { sessions_.tracker()->leaveGroup(); }},
        {"update",
         [this](auto& name) {
             sessions_.push(SessionData<Viewer>{"viewer", {name}}, {}, true);
         }},
        {"flush", [this](auto&) { uploads_->flush(); }},
        {"record", [this](auto& on) { record(on == "on"); }},
        {"forget", [this](auto&) { forget(); }},
        {"wait", [this](auto&) { wait(); }},
        {"read", [this](auto&) { read(); }},
        {"told", [](auto&) { waitUntilTold(); }},
        {"sleep", [](auto& time) { std::this_thread::sleep_for(std::chrono::milliseconds(std::stoi(time))); }},
        {"say", [](auto& word) { say(word); }},
    };
};

}  // namespace

int main(int argc, char** argv) {
    if (argc < 4) return 2;
    const std::string directory = argv[2], agent = argv[3];
    const Options options(directory, agent, argc - 4, argv + 4);
    DocumentsDirectory::set(directory);
    Log::shared().setSink([](LogLevel level, std::string_view message) {
        if (level == LogLevel::error)
            dprintf(STDERR_FILENO, "%.*s\n", static_cast<int>(message.size()), message.data());
    });
    TransferSession::setFactory(agent == "-" ? InProcessTransferSession::factory()
                                             : BackgroundTransferSession::factory(options.agent));
    Host host(argv[1], options.batches);
    for (std::string line; std::getline(std::cin, line);) host.obey(line);
    return 0;
}
