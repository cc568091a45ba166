// What it costs to record through objects and names known at run time, beside the typed path.

#include "benchmarks/Host.h"
#include "benchmarks/Samples.h"
#include "benchmarks/Suites.h"
#include "benchmarks/Table.h"

#include <corvane/Bridge/CV.h>

#include <functional>

namespace corvane::bench {

namespace {

constexpr int events = 20'000;

struct ScreenViewClass final : CVEventType {
    [[nodiscard]] std::vector<CVEventProperty> eventProperties() const override {
        return {{CVEventData::dataClass(), CVEventPropertyRequirement::required, "event"},
                {CVDataEventClass("Screen"), CVEventPropertyRequirement::required, "screen"},
                {CVDataEventClass("Viewer"), CVEventPropertyRequirement::optional, "viewer"}};
    }
};

struct ScreenObject final : CVDataEventType {
    [[nodiscard]] std::string dataName() const override { return "Screen"; }
    [[nodiscard]] CVDictionary toDict() const override { return {{"name", home.name}, {"depth", home.depth}}; }
};

/// A host whose tracker is reached both ways.
struct BridgedHost {
    BridgedHost() {
        manager->processorManager()->add(std::make_shared<NullProcessor>());
        manager->start(Session::Kind::userEvents());
        tracker->pushDataEvent(std::make_shared<ScreenObject>());
        tracker->pushDataEvent(
            std::make_shared<CVRawDataEvent>("Viewer", CVDictionary{{"id", viewer.id}, {"plan", *viewer.plan}}));
    }

    std::shared_ptr<SessionManager> manager = std::make_shared<SessionManager>();
    CVSessionManager bridged{manager};
    std::shared_ptr<CVTracker> tracker = bridged.tracker()->chainWithName("player");
    CVEventClass screenView{"ScreenView", [] { return std::make_shared<ScreenViewClass>(); }};
};

/// What the caller pays for one call, and what one call costs until all are done.
template <class Call>
Figures measure(Tracker& tracker, Call&& call) {
    const auto drain = [&] {
        std::promise<void> reached;
        tracker.transaction([&](AccessTracker&) { reached.set_value(); });
        reached.get_future().wait();
    };
    drain();
    const auto before = nanoseconds();
    Figures figures = burst(events, call);
    drain();
    figures["ns/event, all of it"] = static_cast<double>(nanoseconds() - before) / events;
    return figures;
}

template <class Call>
void addBridged(const std::string& name, Call call) {
    add(name, [call] {
        BridgedHost host;
        return measure(*host.tracker->tracker(), [&](int) { call(host); });
    });
}

template <class Call>
void addTyped(const std::string& name, Call call) {
    add(name, [call] {
        Host host;
        return measure(*host.tracker, [&](int) { call(host); });
    });
}

}  // namespace

void addBridgeBenchmarks() {
    addBridged("bridge/submit, class", [](BridgedHost& host) { host.tracker->submitEventType(host.screenView); });
    addTyped("bridge/submit, class~typed", [](Host& host) { host.tracker->submit<ScreenView>(); });
    addBridged("bridge/push", [](BridgedHost& host) { host.tracker->pushDataEvent(std::make_shared<ScreenObject>()); });
    addTyped("bridge/push~typed", [](Host& host) { host.tracker->push(home); });
    setBar("bridge/push~typed", "mean ns", 2);
}

}  // namespace corvane::bench
