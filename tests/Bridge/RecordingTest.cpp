#include <corvane/Snapshot/Snapshot.h>

#include "tests/Bridge/BridgeFixture.h"

#include <corvane/corvane.h>

#include <cstdint>
#include <map>
#include <optional>

namespace corvane::test {
namespace {

using namespace std::chrono_literals;

// The same vocabulary three times: as types, as classes, and raw.
struct Artist {
    std::string name;
};
struct Track {
    std::string title;
    std::int64_t plays = 0;
    double length = 0;
    bool explicitLyrics = false;
    Date released;
    std::optional<std::string> note;
    std::vector<std::string> tags;
    std::map<std::string, int> counts;
    Artist artist;
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
        {"Prélude \"in\" C\n", -1, 184.25, true, Date(1500ms), "n", {"calm", ""}, {{"a", 1}, {"b", 2}}, {"JSB"}},
        {std::string("\0x", 2), INT64_MAX, 1e300, false, Date(-1999us), std::nullopt, {}, {{"", 0}}, {"\u00e9"}},
    };
    for (const Track& track : tracks) {
        for (const bool withVolume : {false, true}) {
            const auto child = root->chainWithName("player");
            CVDictionary dictionary{{"title", track.title},
                                    {"plays", track.plays},
                                    {"length", track.length},
                                    {"explicitLyrics", track.explicitLyrics},
                                    {"released", track.released}};
            auto entries = dictionary.entries();
            if (track.note) entries.push_back({"note", *track.note});
            entries.push_back({"tags", CVArray(track.tags.begin(), track.tags.end())});
            std::vector<CVValue::Entry> counts;
            for (const auto& [key, count] : track.counts) counts.push_back({key, count});
            entries.push_back({"counts", CVDictionary(counts)});
            entries.push_back({"artist", CVDictionary{{"name", track.artist.name}}});

            child->tracker()->push(track);
            if (withVolume) child->tracker()->push(Volume{0.5});
            std::string typed;
            child->tracker()->submit<Play>(
                [&](const EventSubmitResult& result) { typed = result.event()->json().text(); });
            processor->drain();
            EXPECT_EQ(submit(child, playClass), typed) << "a class finds typed data";

            const auto bridged = root->chainWithName("player");
            bridged->pushDataEvent(raw("Track", CVDictionary(entries)));
            if (withVolume) bridged->pushDataEvent(raw("Volume", {{"level", 0.5}}));
            EXPECT_EQ(submit(bridged, playClass), typed);
            EXPECT_EQ(submit(bridged, rawPlay), typed);
            EXPECT_NE(typed.find("\"tags\":["), std::string::npos);
        }
    }
}

TEST_F(BridgeRecording, PropertiesAreAskedForOncePerTrackerAndName) {
    const auto asked = std::make_shared<int>(0);
    const auto once = eventClass("Once", {}, asked);
    const auto again = eventClass("Once", {{CVDataEventClass("Track"), required}}, asked);
    EXPECT_EQ(submit(root, once), "{}");
    EXPECT_EQ(submit(root, again), "{}") << "the first class of a name defines it";
    root->transactionWithBlock([&](const auto& access) { access->submitEventType(once); });
    processor->drain();
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
    const auto child = root->chainWithName("player");
    const auto view = eventClass("View", {{CVEventData::dataClass(), required, "event"},
                                          {CVTimedData::dataClass(), required, "span"},
                                          {CVEventData::dataClass(), optional, "none"}});
    EXPECT_EQ(submit(child, view), "! Corvane.TrackerError 0: required data is missing: span (TimedData)");
    child->timeEventType(view, Date(1s));
    std::string outcome;
    child->explicitSubmitEvent(view, Date(2500ms), true, keep(outcome));
    processor->drain();
    const JSON json(outcome);
    EXPECT_EQ(json["span"].text(), R"({"startTimestamp":1000,"endTimestamp":2500,"duration":1500})");
    EXPECT_EQ(json["event"]["eventPath"].string(), "/root/player");
    EXPECT_EQ(json["event"]["eventTimestamp"].integer(), 2500);
    EXPECT_EQ(json["event"]["eventID"].string()->size(), 36u);
    EXPECT_FALSE(json["none"].exists());

    // Pushed ones are ordinary data, for raw events too; a class that has only the name gets nothing from the tracker.
    const CVRawEvent rawView{"View", {{"event", {"EventData", required}}, {"span", {"TimedData", required}}}};
    const auto named = eventClass("Named", {{CVDataEventClass("EventData"), required}});
    EXPECT_EQ(submit(child, rawView),
              "! Corvane.TrackerError 0: required data is missing: event (EventData) span (TimedData)");
    EXPECT_EQ(submit(child, named), "! Corvane.TrackerError 0: required data is missing: EventData (EventData)");
    const auto event = std::make_shared<CVEventData>(EventData{"id", Date(5ms), "/p", "s"});
    const auto span = std::make_shared<CVTimedData>(TimedData(Date(4ms), Date(2ms)));
    child->pushDataEvent(event);
    child->pushDataEvent(span);
    EXPECT_EQ(submit(child, rawView),
              R"({"event":{"eventID":"id","eventTimestamp":5,"eventPath":"/p","sessionID":"s"},)"
              R"("span":{"startTimestamp":4,"endTimestamp":2,"duration":-2}})");
    EXPECT_EQ(submit(child, named).substr(0, 26), R"({"EventData":{"eventID":"i)");
    EXPECT_EQ(span->duration(), -2);
}

TEST_F(BridgeRecording, StacksFollowTraitsPopsAndTypes) {
    const CVRawEvent show{"Show", {{"s", {"Screen", optional}}}};
    const CVDataEventClass screen("Screen");
    root->pushDataEvent(raw("Screen", {{"n", 1}}));
    root->pushDataEvent(raw("Screen", {{"n", 2}}));
    root->pushDataEvent(raw("Screen", {{"n", 3}}), {.onlyOnce = true}, "script.lua", 7);
    EXPECT_EQ(submit(root, show), R"({"s":{"n":3}})");
    EXPECT_EQ(submit(root, show), R"({"s":{"n":2}})");
    root->popDataEventType(screen);
    EXPECT_EQ(submit(root, show), R"({"s":{"n":1}})");
    root->pushDataEvent(raw("Screen", {{"n", 4}}), {.onlyOnce = true, .unique = true});
    submit(root, show);
    EXPECT_EQ(submit(root, show), "{}");

    struct Screen {
        int n = 0;
    };
    root->pushDataEvent(raw("Screen", {{"n", 5}}));
    root->tracker()->push(Screen{6});
    EXPECT_EQ(submit(root, show), R"({"s":{"n":6}})") << "typed data takes the place of the bridge's";
    root->popDataEventByName("Screen");
    EXPECT_EQ(submit(root, show), R"({"s":{"n":6}})") << "and is not the bridge's to pop";

    // What is pushed from a script keeps its texts alive by itself, the stack's key too.
    std::shared_ptr<const SnapshotType> snapshot;
    {
        const auto child = root->chainWithName("child");
        std::string name = "A name that is longer than a string holds in place";
        child->pushDataEvent(raw(name, {}), {.unique = true}, "a/file/that/is/longer/than/a/string/in/place.lua", 42);
        child->popDataEventByName(name);
        child->pushDataEvent(raw(name, {}), {.unique = true}, "a/file/that/is/longer/than/a/string/in/place.lua", 43);
        snapshot = child->tracker()->snapshot(SnapshotPolicy::all);
    }
    const auto& entry = dynamic_cast<const Snapshot&>(*snapshot).levels().front().entries.begin()->second.front();
    EXPECT_EQ(entry.key, "A name that is longer than a string holds in place");
    EXPECT_EQ(std::string(entry.file) + ":" + std::to_string(entry.line),
              "a/file/that/is/longer/than/a/string/in/place.lua:43");
}

TEST_F(BridgeRecording, DelayedSubmissionsGoOutOnceWithTheirOwnTime) {
    std::string outcome = "(none)";
    auto child = root->chainWithName("child");
    const Date before = now();
    const auto token = child->delayedSubmitEventType(
        eventClass("Late", {{CVEventData::dataClass(), required, "event"}}), false, keep(outcome));
    const auto rawToken = child->delayedSubmitRawEvent(rawPlay, false, keep(outcome));
    const Date after = now();
    processor->drain();
    EXPECT_EQ(outcome, "(none)");
    token->commit();
    token->commit();
    processor->drain();
    ASSERT_EQ(processor->events.size(), 1u);
    const auto stamp = JSON(outcome)["event"]["eventTimestamp"].integer();
    EXPECT_GE(stamp, millisecondsSince1970(before));
    EXPECT_LE(stamp, millisecondsSince1970(after));

    rawToken->commit();
    processor->drain();
    EXPECT_EQ(outcome, "! Corvane.TrackerError 0: required data is missing: track (Track)");

    const auto orphan = child->delayedSubmitRawEvent(rawPlay, false, [](auto*, auto*) { FAIL() << "no tracker"; });
    processor->drain();
    child.reset();
    orphan->commit();
    processor->drain();
}

TEST_F(BridgeRecording, RestartTimersFollowTheSession) {
    const auto child = root->chainWithName("child");
    const auto watch = eventClass("Watch", {{CVTimedData::dataClass(), required, "span"}});
    child->timeEventType(watch, Date(1s), true);
    child->timeRawEvent(rawPlay, Date(1s), true);
    child->pushDataEvent(raw("Track", {{"title", "x"}}));
    for (int session = 1; session <= 2; ++session) {
        bool ended = false;
        sessions->endSessionWithCompletion([&] { ended = true; });
        processor->drain();
        EXPECT_TRUE(ended);
        std::multiset<std::string> names;
        for (const auto& event : processor->events) names.insert(event.name());
        EXPECT_EQ(names.count("Watch"), static_cast<std::size_t>(session)) << "submitted as each session ends";
        EXPECT_EQ(names.count("Play"), static_cast<std::size_t>(session));
        sessions->startSessionForKind(CVSessionKind::telemetry);
    }
    const auto first = std::find_if(processor->events.begin(), processor->events.end(),
                                    [](const auto& event) { return event.name() == "Watch"; });
    EXPECT_EQ(first->json()["span"]["startTimestamp"].integer(), 1000);

    root->submitRawEvent(rawPlay, true, [](auto*, auto*) { FAIL() << "no timer runs on the root"; });
    processor->drain();
}

TEST_F(BridgeRecording, GroupsAndPathsAreTheTrackers) {
    const auto child = root->chainWithName("a")->chainWithName("b");
    EXPECT_EQ(child->path(), (std::vector<std::string>{"root", "a", "b"}));
    EXPECT_EQ(child->name(), "b");
    std::vector<std::optional<std::string>> groups;
    const auto note = [&](const CVProcessEvent* event, const CVError*) { groups.push_back(event->groupName()); };
    const CVRawEvent any{"Any", {}};
    root->enterGroupWithName("outer");
    child->submitRawEvent(any, false, note);
    child->enterGroup();
    child->submitRawEvent(any, false, note);
    child->leaveGroup();
    child->leaveGroup();
    child->submitRawEvent(any, false, note);
    child->explicitSubmitRawEvent(any, Date(1s), false, note);
    processor->drain();
    EXPECT_EQ(groups, (std::vector<std::optional<std::string>>{"outer", "", std::nullopt, std::nullopt}));
}

}  // namespace
}  // namespace corvane::test
