// How the cost of an event grows with what is around it.

#include <corvane/Testing/TemporaryDocuments.h>

#include "benchmarks/Host.h"
#include "benchmarks/Samples.h"
#include "benchmarks/Suites.h"
#include "benchmarks/Table.h"

#include <utility>

namespace corvane::bench {

namespace {

template <int>
struct Part {
    int value = 0;
};

/// An event type with `count` properties of different types, spelled once for all counts.
template <int count>
struct Wide {
    template <int... i>
    static void push(Tracker& tracker, std::integer_sequence<int, i...>) {
        (tracker.push(Part<i>{i}), ...);
    }
};
struct One {
    EventProperty<Part<0>> a = required;
};
struct Four {
    EventProperty<Part<0>> a = required;
    EventProperty<Part<1>> b = required;
    EventProperty<Part<2>> c = required;
    EventProperty<Part<3>> d = required;
};
struct Sixteen {
    EventProperty<Part<0>> a = required;
    EventProperty<Part<1>> b = required;
    EventProperty<Part<2>> c = required;
    EventProperty<Part<3>> d = required;
    EventProperty<Part<4>> e = required;
    EventProperty<Part<5>> f = required;
    EventProperty<Part<6>> g = required;
    EventProperty<Part<7>> h = required;
    EventProperty<Part<8>> i = required;
    EventProperty<Part<9>> j = required;
    EventProperty<Part<10>> k = required;
    EventProperty<Part<11>> l = required;
    EventProperty<Part<12>> m = required;
    EventProperty<Part<13>> n = required;
    EventProperty<Part<14>> o = required;
    EventProperty<Part<15>> p = required;
};

template <class E>
Figures nanosecondsPerEvent(Host& host, const std::shared_ptr<Tracker>& tracker, int events = 10'000) {
    const auto before = nanoseconds();
    for (int i = 0; i < events; ++i) tracker->submit<E>();
    host.drain();
    return {{"ns/event", static_cast<double>(nanoseconds() - before) / events}};
}

template <class E, int count>
void addProperties() {
    add(
        "growth/properties " + std::to_string(count),
        [] {
            Host host;
            Wide<count>::push(*host.tracker, std::make_integer_sequence<int, count>());
            return nanosecondsPerEvent<E>(host, host.tracker);
        },
        3);
}

}  // namespace

void addGrowthBenchmarks() {
    addProperties<One, 1>();
    addProperties<Four, 4>();
    addProperties<Sixteen, 16>();
    for (const int depth : {1, 4, 16, 64}) {
        add(
            "growth/chain of " + std::to_string(depth) + " trackers",
            [=] {
                Host host;
                auto tracker = host.tracker;
                for (int i = 1; i < depth; ++i) tracker = tracker->chain("child");
                return nanosecondsPerEvent<ScreenView>(host, tracker);
            },
            3);
    }
    for (const int entries : {1, 100, 10'000}) {
        add(
            "growth/stack of " + std::to_string(entries) + " entries",
            [=] {
                Host host;
                for (int i = 1; i < entries; ++i) host.tracker->push(home);
                host.drain();
                return nanosecondsPerEvent<ScreenView>(host, host.tracker);
            },
            3);
    }
    for (const int processors : {1, 4, 16}) {
        add(
            "growth/processors " + std::to_string(processors),
            [=] {
                Host host;
                for (int i = 1; i < processors; ++i)
                    host.sessions.processorManager()->add(std::make_shared<NullProcessor>());
                return nanosecondsPerEvent<ScreenView>(host, host.tracker);
            },
            3);
    }
    for (const int batchSize : {10, 50, 200, 1'000}) {
        add(
            "growth/durable, batch of " + std::to_string(batchSize),
            [=] {
                const test::TemporaryDocuments documents;
                Host host(std::make_shared<UploadBatchEventProcessor>(Client{"com.example.bench", "Bench", "1.0", 1},
                                                                      Endpoint{"http://127.0.0.1:1/in", "growth"},
                                                                      UploadBatchEventConfig(batchSize, false)));
                return nanosecondsPerEvent<ScreenView>(host, host.tracker, 2'000);
            },
            1);
    }
    for (const int events : {10, 100, 1'000}) {
        add(
            "growth/durable, group of " + std::to_string(events),
            [=] {
                const test::TemporaryDocuments documents;
                Host host(std::make_shared<UploadBatchEventProcessor>(Client{"com.example.bench", "Bench", "1.0", 1},
                                                                      Endpoint{"http://127.0.0.1:1/in", "growth"}));
                host.tracker->enterGroup("checkout");
                return nanosecondsPerEvent<ScreenView>(host, host.tracker, events);
            },
            1);
    }
}

}  // namespace corvane::bench
