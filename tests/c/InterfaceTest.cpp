#include "CFixture.h"

#include <corvane/Models/EventData.h>
#include <corvane/Session/SessionManager.h>
#include <corvane/Testing/RecordingProcessor.h>
#include <corvane/Testing/ScriptedServer.h>

#include <optional>
#include <regex>

namespace corvane::test {
namespace {

struct Artist {
    std::string name;
    std::optional<std::string> label;
};
struct Track {
    std::string title;
    bool isLive = false;
    int plays = 0;
    std::uint64_t bytes = 0;
    double length = 0;
    double rating = 0;
    std::vector<std::string> tags;
    Artist artist;
};
struct Played {
    EventProperty<EventData> event = required;
    EventProperty<TimedData> span = required;
    EventProperty<Track> track = required;
    EventProperty<Artist> guest = optional;
};

// What no two events have in common.
std::string masked(std::string json) {
    json = std::regex_replace(json, std::regex("[0-9A-F]{8}-[0-9A-F-]{27}"), "ID");
    return std::regex_replace(json, std::regex("(Timestamp|duration)\":\\d+"), "$1\":T");
}

std::string typedJSON() {
    SessionManager sessions;
    const auto recording = std::make_shared<RecordingProcessor>();
    sessions.processorManager()->add(recording);
    sessions.start(Session::Kind::userEvents());
    const auto tracker = sessions.tracker()->chain("player");
    tracker->push(
        Track{"Pr\u00e9lude \"n\u00ba 1\"\n", true, -3, ~std::uint64_t{0}, 184.5, 3.0, {"calm", ""}, {"Z", {}}});
    tracker->time<Played>();
    tracker->submit<Played>();
    sessions.endSync();
    return masked(recording->only("Played").json().text());
}

TEST_F(CTest, EventsAreThoseOfTypedDeclarationsToTheByte) {
    Recorder recorder;
    auto* sessions = recorded(recorder);
    corvane_sessions_start(sessions, CORVANE_USER_EVENTS, nullptr, &error);
    auto* root = corvane_sessions_tracker(sessions, &error);
    auto* tracker = corvane_tracker_chain(root, "player", &error);
    auto* played = corvane_event_create("Played", &error);
    corvane_event_require(played, "event", CORVANE_EVENT_DATA, &error);
    corvane_event_require(played, "span", CORVANE_TIMED_DATA, &error);
    corvane_event_require(played, "track", "Track", &error);
    corvane_event_allow(played, "guest", "Artist", &error);

    auto* track = corvane_dictionary_create(&error);
    auto* tags = corvane_array_create(&error);
    auto* artist = corvane_value_from_json(R"({"name": "Z"})", &error);
    corvane_array_add_string(tags, "calm", &error);
    corvane_array_add_string(tags, "", &error);
    corvane_dictionary_set_string(track, "title", "Pr\u00e9lude \"n\u00ba 1\"\n", &error);
    corvane_dictionary_set_bool(track, "isLive", true, &error);
    corvane_dictionary_set_integer(track, "plays", -3, &error);
    corvane_dictionary_set_unsigned(track, "bytes", ~std::uint64_t{0}, &error);
    corvane_dictionary_set_real(track, "length", 184.5, &error);
    corvane_dictionary_set_real(track, "rating", 3, &error);
    corvane_dictionary_set_value(track, "tags", tags, &error);
    corvane_dictionary_set_value(track, "artist", artist, &error);
    const char* json =
        R"( {"title": "Pr\u00e9lude \"n\u00ba 1\"\n", "isLive": true, "plays": -3, "bytes": 18446744073709551615,
             "length": 1845e-1, "rating": 3.0, "tags": ["calm", ""], "artist": {"name": "Z"}} )";

    ASSERT_TRUE(corvane_tracker_push(tracker, "Track", track, nullptr, &error)) << error.message;
    ASSERT_TRUE(corvane_tracker_time(tracker, played, nullptr, &error)) << error.message;
    ASSERT_TRUE(corvane_tracker_submit(tracker, played, nullptr, &error)) << error.message;
    ASSERT_TRUE(corvane_tracker_push_json(tracker, "Track", json, nullptr, &error)) << error.message;
    ASSERT_TRUE(corvane_tracker_time(tracker, played, nullptr, &error)) << error.message;
    ASSERT_TRUE(corvane_tracker_submit(tracker, played, nullptr, &error)) << error.message;
    // Of two members of one name the later one counts, in its place.
    const std::string twice = R"({"title": 1, )" + std::string(json + 2);
    ASSERT_TRUE(corvane_tracker_push_json(tracker, "Track", twice.c_str(), nullptr, &error)) << error.message;
    ASSERT_TRUE(corvane_tracker_time(tracker, played, nullptr, &error)) << error.message;
    ASSERT_TRUE(corvane_tracker_submit(tracker, played, nullptr, &error)) << error.message;
    ASSERT_TRUE(corvane_sessions_end_and_wait(sessions, &error)) << error.message;

    const std::string expected = "Played " + typedJSON() + " -";
    ASSERT_EQ(recorder.lines.size(), 3u);
    for (const auto& line : recorder.lines) EXPECT_EQ(masked(line), expected);
    for (void* object : std::initializer_list<void*>{sessions, root, tracker, played, track, tags, artist}) {
        corvane_release(object);
    }
}

TEST_F(CTest, EverythingOfTrackersIsThere) {
    Recorder recorder;
    auto* sessions = recorded(recorder);
    auto* tracker = corvane_sessions_tracker(sessions, &error);
    auto* view = event("View", {"Screen"});
    std::string told;
    using Change = Block<corvane_access*, std::int32_t>;
    auto* observer = corvane_tracker_observe(
        tracker, &Change::run,
        new Change{[&](corvane_access*, std::int32_t change) { told += std::to_string(change); }}, &Change::destroy,
        &error);
    using Inside = Block<corvane_access*>;
    corvane_tracker_when_session(
        tracker, &Inside::run, new Inside{[&](corvane_access* access) {
            EXPECT_TRUE(corvane_access_push_json(access, "Screen", R"({"n":1})", nullptr, nullptr));
            EXPECT_TRUE(corvane_access_submit(access, view, nullptr, nullptr));
            EXPECT_TRUE(corvane_access_pop(access, "Screen", nullptr));
        }},
        &Inside::destroy, &error);
    const corvane_push_options once{.size = sizeof once, .traits = CORVANE_ONLY_ONCE, .file = "host.c", .line = 7};
    corvane_sessions_start(sessions, CORVANE_CUSTOM, "kiosk", &error);
    corvane_tracker_enter_group(tracker, "flow", &error);
    corvane_tracker_push_json(tracker, "Screen", R"({"n":2})", &once, &error);
    auto* later = corvane_tracker_submit_later(tracker, view, nullptr, &error);
    auto* snapshot = corvane_tracker_snapshot(tracker, CORVANE_SNAPSHOT_NOW, &error);
    auto* lacking = event("Lacking", {"Screen", "Other"});
    auto* evaluation = corvane_snapshot_evaluate(snapshot, lacking, &error);
    corvane_evaluated property{.size = sizeof property};
    EXPECT_FALSE(corvane_evaluation_is_valid(evaluation, &error));
    ASSERT_TRUE(corvane_evaluation_property(evaluation, 0, &property, &error));
    EXPECT_STREQ(property.json, R"({"n":2})");
    ASSERT_TRUE(corvane_evaluation_property(evaluation, 1, &property, &error));
    EXPECT_TRUE(property.is_missing && !property.is_optional && std::string(property.property) == "Other");
    EXPECT_FALSE(corvane_evaluation_property(evaluation, 2, &property, &error));
    corvane_delayed_commit(later, &error);
    corvane_delayed_commit(later, &error);

    std::string outcomes;
    using Outcome = Block<const corvane_process_event*, const corvane_error*>;
    const auto outcome = [&] {
        return corvane_submit_options{
            .size = sizeof(corvane_submit_options),
            .completion = &Outcome::run,
            .context = new Outcome{[&](const corvane_process_event*, const corvane_error* failed) {
                outcomes += failed ? failed->domain : "accepted";
            }},
            .destroy = &Outcome::destroy};
    };
    const int before = destroyed;
    auto lacks = outcome();  // the data has left the stack
    corvane_tracker_submit(tracker, view, &lacks, &error);
    corvane_sessions_end_and_wait(sessions, &error);
    corvane_release(observer);
    corvane_sessions_start(sessions, CORVANE_TELEMETRY, nullptr, &error);
    corvane_release(sessions);
    auto late = outcome();  // the session manager has gone
    EXPECT_TRUE(corvane_tracker_submit(tracker, view, &late, &error));
    EXPECT_TRUE(eventually([&] { return destroyed == before + 3; }));  // the observer's, too

    EXPECT_EQ(told, "0123");
    EXPECT_EQ(recorder.lines,
              (std::vector<std::string>{R"(View {"Screen":{"n":1}} -)", R"(View {"Screen":{"n":2}} flow)"}));
    EXPECT_EQ(outcomes, "Corvane.TrackerErrorCorvane.TrackerError");
    for (void* object : std::initializer_list<void*>{tracker, view, later, snapshot, lacking, evaluation}) {
        corvane_release(object);
    }
}

TEST_F(CTest, UploadsAreSignedFilteredCountedAndTold) {
    const TemporaryDocuments documents;
    ScriptedServer server;
    ASSERT_TRUE(corvane_documents_directory_set(documents.path().c_str(), &error));
    const std::string url = server.url("/in");
    const corvane_upload_options options{.size = sizeof options,
                                         .identifier = "com.example.c",
                                         .name = "C",
                                         .version = "1.0",
                                         .build = 3,
                                         .url = url.c_str(),
                                         .endpoint = "main",
                                         .headers = [](void*, corvane_headers* headers) {
                                             EXPECT_TRUE(corvane_header_add(headers, "X-Token", "t", nullptr));
                                         }};
    auto* uploads = corvane_uploads_create(&options, &error);
    ASSERT_TRUE(uploads) << error.message;
    auto* filter = corvane_filtering_create(
        uploads,
        [](void*, const corvane_process_event* event, corvane_text* text) -> std::int32_t {
            if (std::string(event->json).find("drop") != std::string::npos) return CORVANE_DROP;
            corvane_text_set(text, R"({"Screen": {"n": 0}})", nullptr);
            return CORVANE_REPLACE;
        },
        nullptr, nullptr, &error);
    std::atomic<int> steps = 0;
    using Update = Block<const corvane_delivery_update*>;
    corvane_uploads_observe(uploads, &Update::run, new Update{[&](const corvane_delivery_update* update) {
                                if (update->step == CORVANE_DELIVERED && update->status == 200) ++steps;
                            }},
                            &Update::destroy, &error);
    auto* sessions = corvane_sessions_create(&error);
    auto* tracker = corvane_sessions_tracker(sessions, &error);
    auto* view = event("View", {"Screen"});
    ASSERT_TRUE(corvane_sessions_add_processor(sessions, filter, &error)) << error.message;
    ASSERT_TRUE(corvane_sessions_push_json(sessions, "viewer", "Viewer", R"({"id": "v"})", nullptr, &error));
    corvane_sessions_start(sessions, CORVANE_USER_EVENTS, nullptr, &error);
    for (const char* json : {R"({"n":1})", R"({"n":"drop"})", R"({"n":2})"}) {
        corvane_tracker_push_json(tracker, "Screen", json, nullptr, &error);
        corvane_tracker_submit(tracker, view, nullptr, &error);
    }
    corvane_sessions_end_and_wait(sessions, &error);
    corvane_delivery_report report{.size = sizeof report};
    ASSERT_TRUE(corvane_uploads_wait(uploads, 20'000, 0, &report, &error)) << error.message;
    EXPECT_EQ(report.delivered.events, 2);
    EXPECT_TRUE(eventually([&] { return steps == 1; }));
    corvane_ledger ledger{.size = sizeof ledger};
    ASSERT_TRUE(corvane_uploads_ledger(uploads, &ledger, &error)) << error.message;
    EXPECT_EQ(ledger.delivered.documents, 1);
    EXPECT_EQ(ledger.unaccounted, 0);

    ASSERT_EQ(server.documents().size(), 1u);
    const JSON document = server.documents()[0];
    EXPECT_EQ(document["data"]["session"]["viewer"]["id"].string(), "v");
    EXPECT_EQ(document["data"]["events"][1]["data"].text(), R"({"Screen":{"n":0}})");
    EXPECT_EQ(server.requests()[0].header("X-Token"), "t");
    for (void* object : std::initializer_list<void*>{uploads, filter, sessions, tracker, view}) corvane_release(object);
}

}  // namespace
}  // namespace corvane::test
