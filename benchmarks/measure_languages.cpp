// What an event costs from C beside the typed path; scripts/bench-languages runs it beside other languages:
//
//     measure_languages typed|calls|json
//
// Prints nanoseconds of the caller for data that is pushed and an event that is submitted (the median of bursts of
// 1,000, between which the queue comes to rest), and microseconds of CPU for each until it is processed.

#include <corvane/c/corvane.h>
#include <corvane/corvane.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <ctime>
#include <functional>
#include <string>
#include <vector>

using namespace corvane;

namespace {

constexpr int bursts = 200, burst = 1000;

struct Screen {
    std::string name;
    int depth = 0;
    double ratio = 0;
};
struct ScreenView {
    EventProperty<EventData> event = required;
    EventProperty<Screen> screen = required;
};

long processed = 0;

double cpuMicroseconds() {
    timespec time{};
    clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) * 1e6 + static_cast<double>(time.tv_nsec) / 1e3;
}

void measure(const std::function<void(int)>& record, const std::function<void()>& rest) {
    std::vector<double> nanoseconds;
    const double before = cpuMicroseconds();
    for (int i = 0; i < bursts; ++i) {
        const auto begun = std::chrono::steady_clock::now();
        for (int j = 0; j < burst; ++j) record(j);
        const std::chrono::duration<double, std::nano> took = std::chrono::steady_clock::now() - begun;
        nanoseconds.push_back(took.count() / burst);
        rest();
    }
    const double cpu = (cpuMicroseconds() - before) / (bursts * burst);
    if (processed != bursts * burst) {
        std::fprintf(stderr, "measure_languages: %ld events were processed\n", processed);
        std::exit(1);
    }
    std::nth_element(nanoseconds.begin(), nanoseconds.begin() + bursts / 2, nanoseconds.end());
    std::printf("%.1f %.3f\n", nanoseconds[bursts / 2], cpu);
}

struct Counter final : EventProcessorType {
    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {}
    void process(const ProcessEvent& event) override { processed += !event.json().text().empty(); }
};

void measureTyped() {
    SessionManager sessions;
    sessions.processorManager()->add(std::make_shared<Counter>());
    const auto tracker = sessions.tracker()->chain("player");
    sessions.start(Session::Kind::userEvents());
    measure(
        [&](int i) {
            tracker->push(Screen{"home", i, 0.5}, {DataEventTrait::unique});
            tracker->submit<ScreenView>();
        },
        [&] {
            sessions.endSync();
            sessions.start(Session::Kind::userEvents());
        });
}

void measureC(bool isText) {
    corvane_processor_callbacks callbacks{};
    callbacks.size = sizeof callbacks;
    callbacks.process = [](void*, const corvane_process_event* event) { processed += event->json_length > 0; };
    auto* sessions = corvane_sessions_create(nullptr);
    corvane_sessions_add_processor(sessions, corvane_processor_create(&callbacks, nullptr, nullptr, nullptr), nullptr);
    auto* tracker = corvane_tracker_chain(corvane_sessions_tracker(sessions, nullptr), "player", nullptr);
    auto* view = corvane_event_create("ScreenView", nullptr);
    corvane_event_require(view, "event", CORVANE_EVENT_DATA, nullptr);
    corvane_event_require(view, "screen", "Screen", nullptr);
    corvane_push_options unique{};
    unique.size = sizeof unique;
    unique.traits = CORVANE_UNIQUE;
    corvane_sessions_start(sessions, CORVANE_USER_EVENTS, nullptr, nullptr);
    measure(
        [&](int i) {
            if (isText) {
                char json[80];
                std::snprintf(json, sizeof json, R"({"name":"home","depth":%d,"ratio":0.5})", i);
                corvane_tracker_push_json(tracker, "Screen", json, &unique, nullptr);
            } else {
                auto* screen = corvane_dictionary_create(nullptr);
                corvane_dictionary_set_string(screen, "name", "home", nullptr);
                corvane_dictionary_set_integer(screen, "depth", i, nullptr);
                corvane_dictionary_set_real(screen, "ratio", 0.5, nullptr);
                corvane_tracker_push(tracker, "Screen", screen, &unique, nullptr);
                corvane_release(screen);
            }
            corvane_tracker_submit(tracker, view, nullptr, nullptr);
        },
        [&] {
            corvane_sessions_end_and_wait(sessions, nullptr);
            corvane_sessions_start(sessions, CORVANE_USER_EVENTS, nullptr, nullptr);
        });
}

}  // namespace

int main(int count, char** arguments) {
    const std::string way = count == 2 ? arguments[1] : "";
    if (way == "typed") {
        measureTyped();
    } else if (way == "calls" || way == "json") {
        measureC(way == "json");
    } else {
        std::fprintf(stderr, "usage: measure_languages typed|calls|json\n");
        return 2;
    }
    return 0;
}
