#include <corvane/Snapshot/Snapshot.h>

#include "tests/Bridge/BridgeFixture.h"

#include <corvane/corvane.h>

namespace corvane::test {
namespace {

// The same vocabulary three times: as types, as classes, and raw.
struct Track {
    std::string title;
    std::int64_t plays = 0;
    double length = 0;
    Date released;
    std::vector<std::string> tags;
};
struct Volume {
    double level = 0;
};
struct Play {
    EventProperty<Track> track = corvane::required;
    EventProperty<Volume> volume = EventProperty<Volume>::optional;
};

class BridgeRecording : public BridgeTest {
  protected:
    const CVEventClass playClass = eventClass(
        "Play", {{CVDataEventClass("Track"), required, "track"}, {CVDataEventClass("Volume"), optional, "volume"}});
    const CVRawEvent rawPlay{"Play", {{"track", {"Track", required}}, {"volume", {"Volume", optional}}}};
};

TEST_F(BridgeRecording, EveryPathGivesTheSameJSON) {
    const Track tracks[] = {
        {},
        {"Prélude \"in\" C\n", -1, 184.25, Date(1500ms), {"calm", ""}},
        {std::string("\0x", 2), INT64_MAX, 1e300, Date(-1999us), {}},
    };
    for (const Track& track : tracks) {
        const CVDictionary dictionary{{"title", track.title},
                                      {"plays", track.plays},
                                      {"length", track.length},
                                      {"released", track.released},
                                      {"tags", CVArray(track.tags.begin(), track.tags.end())}};
        const auto child = root->chainWithName("player"), bridged = root->chainWithName("player");
        child->tracker()->push(track);
        child->tracker()->push(Volume{0.5});
        std::string typed;
        child->tracker()->submit<Play>([&](const EventSubmitResult& result) { typed = result.event()->json().text(); });
        processor->settle();
        EXPECT_EQ(submit(child, playClass), typed) << "a class finds typed data";
        bridged->pushDataEvent(raw("Track", dictionary));
        bridged->pushDataEvent(raw("Volume", {{"level", 0.5}}));
        EXPECT_EQ(submit(bridged, playClass), typed);
        EXPECT_EQ(submit(bridged, rawPlay), typed);
        EXPECT_NE(typed.find("\"tags\":["), std::string::npos);
    }
}

TEST_F(BridgeRecording, PropertiesAreAskedForOncePerTrackerAndName) {
    const auto asked = std::make_shared<int>(0);
    const auto once = eventClass("Once", {}, asked);
    const auto again = eventClass("Once", {{CVDataEventClass("Track"), required}}, asked);
    EXPECT_EQ(submit(root, once), "{}");
    EXPECT_EQ(submit(root, again), "{}") << "the first class of a name defines it";
    root->transactionWithBlock([&](const auto& access) { access->submitEventType(once); });
    processor->settle();
    EXPECT_EQ(*asked, 1);
    submit(root->chainWithName("child"), once);
    EXPECT_EQ(*asked, 2);

    int failures = 0;
    const CVEventClass flaky{
        "Flaky", [&]() -> std::shared_ptr<CVEventType> {
            if (++failures == 1) throw std::runtime_error("no memory for scripts");
            return failures == 2 ? nullptr : std::make_shared<CountingEvent>(std::vector<CVEventProperty>{}, asked);
        }};
    EXPECT_EQ(submit(root, flaky), "! Corvane.HostError 0: no memory for scripts");
    EXPECT_EQ(submit(root, flaky), "! Corvane.BridgeError 0: the instance of event class Flaky is missing");
    EXPECT_EQ(submit(root, flaky), "{}") << "a failure is not kept";
}

TEST_F(BridgeRecording, BuiltInRecordsReachTheClassesThatDeclareThem) {
    const auto view = eventClass("View", {{CVEventData::dataClass(), required, "event"},
                                          {CVTimedData::dataClass(), required, "span"},
                                          {CVEventData::dataClass(), optional, "none"}});
    root->timeEventType(view, Date(1s));
    std::string outcome;
    root->explicitSubmitEvent(view, Date(2500ms), true, keep(outcome));
    processor->settle();
    const JSON json(outcome);
    EXPECT_EQ(json["span"].text(), R"({"startTimestamp":1000,"endTimestamp":2500,"duration":1500})");
    EXPECT_EQ(json["event"]["eventTimestamp"].integer(), 2500);
    EXPECT_FALSE(json["none"].exists());

    // Pushed ones are ordinary data; a class or a raw event that has only the name gets nothing from the tracker.
    const CVRawEvent named{"View", {{"event", {"EventData", required}}, {"span", {"TimedData", required}}}};
    EXPECT_EQ(submit(root, named),
              "! Corvane.TrackerError 0: required data is missing: event (EventData) span (TimedData)");
    root->pushDataEvent(std::make_shared<CVEventData>(EventData{"id", Date(5ms), "/p", "s"}));
    root->pushDataEvent(std::make_shared<CVTimedData>(TimedData(Date(4ms), Date(2ms))));
    EXPECT_EQ(submit(root, named), R"({"event":{"eventID":"id","eventTimestamp":5,"eventPath":"/p","sessionID":"s"},)"
                                   R"("span":{"startTimestamp":4,"endTimestamp":2,"duration":-2}})");
}

TEST_F(BridgeRecording, StacksFollowTraitsPopsAndTypes) {
    const CVRawEvent show{"Show", {{"s", {"Screen", optional}}}};
    root->pushDataEvent(raw("Screen", {{"n", 1}}));
    root->pushDataEvent(raw("Screen", {{"n", 2}}));
    root->pushDataEvent(raw("Screen", {{"n", 3}}), {.onlyOnce = true}, "script.lua", 7);
    EXPECT_EQ(submit(root, show), R"({"s":{"n":3}})");
    root->popDataEventType(CVDataEventClass("Screen"));
    EXPECT_EQ(submit(root, show), R"({"s":{"n":1}})");

    struct Screen {
        int n = 0;
    };
    root->pushDataEvent(raw("Screen", {{"n", 5}}), {.unique = true});
    root->tracker()->push(Screen{6});
    root->popDataEventByName("Screen");
    EXPECT_EQ(submit(root, show), R"({"s":{"n":6}})") << "typed data is not the bridge's to pop";
}

TEST_F(BridgeRecording, WhatIsPushedFromAScriptKeepsItsTextsAliveByItself) {
    const std::string name = "A name that is longer than a string holds in place";
    const std::string file = "a/file/that/is/longer/than/a/string/in/place.lua";
    const auto child = root->chainWithName("child");
    child->pushDataEvent(raw(name, {}), {.unique = true}, file, 42);
    child->popDataEventByName(name);
    child->pushDataEvent(raw(name, {}), {.unique = true}, file, 43);
    const auto snapshot = child->tracker()->snapshot(SnapshotPolicy::all);
    const auto& entry = dynamic_cast<const Snapshot&>(*snapshot).levels().front().entries.begin()->second.front();
    EXPECT_EQ(entry.key, name);
    EXPECT_EQ(std::string(entry.file) + ":" + std::to_string(entry.line), file + ":43");
}

TEST_F(BridgeRecording, EveryCallReachesTheTracker) {
    const CVRawEvent mark{"Mark", {}};
    const auto markClass = eventClass("MarkClass", {});
    const auto child = root->chainWithName("a")->chainWithName("b");
    EXPECT_EQ(child->path(), (std::vector<std::string>{"root", "a", "b"}));
    EXPECT_EQ(child->name(), "b");
    std::vector<std::shared_ptr<CVDelayedToken>> tokens;
    const std::pair<std::function<void()>, std::vector<std::string>> cases[] = {
        {[&] { root->enterGroupWithName("outer"); }, {"enter outer"}},
        {[&] { child->enterGroup(); }, {"enter "}},
        {[&] { child->leaveGroup(), child->leaveGroup(); }, {"leave ", "leave outer"}},
        {[&] { child->submitEventType(markClass); }, {"process MarkClass"}},
        {[&] { child->explicitSubmitRawEvent(mark, Date(1s)); }, {"process Mark"}},
        {[&] { child->submitRawEvent(mark, true), child->submitEventType(markClass, true); }, {}},
        {[&] {
             tokens = {child->delayedSubmitRawEvent(mark), child->delayedSubmitEventType(markClass)};
         },
         {}},
        {[&] { tokens[0]->commit(), tokens[0]->commit(); }, {"process Mark"}},
        {[&] { tokens[1]->commit(); }, {"process MarkClass"}},
        {[&] { child->timeRawEvent(mark, Date(1s), true), child->timeEventType(markClass, Date(1s), true); }, {}},
        {[&] { sessions->endSession(); }, {"end", "process Mark", "process MarkClass"}},
        {[&] { root->suspend(), root->enterGroupWithName("late"), root->resume(); }, {"enter late"}},
    };
    for (const auto& [call, expected] : cases) {
        processor->clear();
        call();
        auto history = processor->history();
        std::sort(history.begin(), history.end());
        EXPECT_EQ(history, expected);
    }
}

}  // namespace
}  // namespace corvane::test
