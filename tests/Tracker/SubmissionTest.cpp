#include "tests/support/TrackingFixture.h"

#include <future>
#include <regex>

namespace corvane::test {
namespace {

using namespace std::chrono_literals;

class Submission : public TrackingTest {};

TEST_F(Submission, CarriesTheDataInScopeUnderTheNamesOfTheProperties) {
    root->push(Viewer{"7", "gold"});
    root->push(Screen{"home"});
    EXPECT_EQ(submit<ScreenView>(root), R"({"screen":{"name":"home"},"viewer":{"id":"7","plan":"gold"}})");
    root->pop<Viewer>();
    EXPECT_EQ(submit<ScreenView>(root), R"({"screen":{"name":"home"}})");
    ASSERT_EQ(processor->events.size(), 2u);
    EXPECT_EQ(processor->events[0].name(), "ScreenView");
    EXPECT_FALSE(processor->events[0].groupName());
}

TEST_F(Submission, IsStampedWithTimePathAndSession) {
    const auto tracker = root->chain("b")->chain("c");
    EXPECT_EQ(tracker->path(), (std::vector<std::string>{"root", "b", "c"}));
    const Date before = now();
    submit<Identified>(tracker);
    const JSON event = processor->events.at(0).json()["event"];
    EXPECT_TRUE(std::regex_match(*event["eventID"].string(),
                                 std::regex("[0-9A-F]{8}-[0-9A-F]{4}-4[0-9A-F]{3}-[89AB][0-9A-F]{3}-[0-9A-F]{12}")));
    EXPECT_EQ(event["eventPath"].string(), "/root/b/c");
    EXPECT_EQ(event["sessionID"].string(), processor->sessions.at(0).identifier);
    EXPECT_GE(event["eventTimestamp"].integer(), millisecondsSince1970(before));
    EXPECT_LE(event["eventTimestamp"].integer(), millisecondsSince1970(now()));

    struct Twice {
        EventProperty<EventData> first = required;
        EventProperty<EventData> second = required;
    };
    const JSON twice(submit<Twice>(tracker));
    EXPECT_EQ(twice["first"].text(), twice["second"].text()) << "one identity for each submission";
    processor->events.pop_back();

    tracker->explicitSubmit<Identified>(Date(1500ms));
    processor->drain();
    EXPECT_EQ(processor->events.at(1).json()["event"]["eventTimestamp"].integer(), 1500);
}

TEST_F(Submission, TakesTheTimeOfTheCallNotOfTheQueue) {
    std::promise<void> release;
    sessions->transaction([&](AccessSessionManager&) { release.get_future().wait(); });
    root->submit<Identified>();
    const Date called = now();
    while (now() < called + 20ms) {
    }
    release.set_value();
    processor->drain();
    EXPECT_LE(processor->events.at(0).json()["event"]["eventTimestamp"].integer(), millisecondsSince1970(called));
}

struct Three {
    EventProperty<Screen> first = required;
    EventProperty<int> number = required;
    EventProperty<Viewer> second = required;
    std::string note = "not a property";
};
struct Nothing {
    std::string note;
    int count = 0;
};

TEST_F(Submission, ListsEveryMissingPropertyInDeclarationOrder) {
    std::optional<TrackerError> error;
    root->submit<Three>([&](const EventSubmitResult& result) { error = *result.error()->as<TrackerError>(); });
    processor->drain();
    EXPECT_EQ(error->value(), TrackerError::eventMissingData);
    EXPECT_EQ(error->missingData(),
              (std::vector<TrackerError::MissingData>{{"first", DataType::of<Screen>(), "Screen"},
                                                      {"number", DataType::of<int>(), "int"},
                                                      {"second", DataType::of<Viewer>(), "Viewer"}}));
    EXPECT_STREQ(error->what(), "required data is missing: first (Screen) number (int) second (Viewer)");
    EXPECT_TRUE(processor->events.empty());
    EXPECT_EQ(submit<Nothing>(root), "{}");
}

struct Bad {
    double value = 0.0 / 0.0;
};
struct BadEvent {
    EventProperty<Bad> bad = required;
};
struct Thrower {
    JSON toDict() const { throw std::runtime_error("host says no"); }
};
struct ThrowingEvent {
    EventProperty<Thrower> data = required;
};

TEST_F(Submission, ReportsDataThatCannotBeEncodedAndGoesOn) {
    root->push(Bad{});
    root->push(Thrower{});
    root->push(Screen{"home"});
    EXPECT_EQ(submit<BadEvent>(root), "! bad.value: the number is infinite or not a number");
    EXPECT_EQ(submit<ThrowingEvent>(root), "! host says no");
    EXPECT_EQ(submit<ScreenView>(root), R"({"screen":{"name":"home"}})");
    EXPECT_EQ(processor->events.size(), 1u);
}

struct OptionalBuiltIns {
    EventProperty<EventData> event = optional;
    EventProperty<TimedData> span = optional;
};

TEST_F(Submission, GivesNoBuiltInValueToAnOptionalProperty) {
    root->time<OptionalBuiltIns>();
    EXPECT_EQ(submit<OptionalBuiltIns>(root), "{}");
    root->push(EventData{"pushed", Date(), "", ""});
    EXPECT_EQ(submit<OptionalBuiltIns>(root),
              R"({"event":{"eventID":"pushed","eventTimestamp":0,"eventPath":"","sessionID":""}})");
}

TEST_F(Submission, FailsWithoutASessionOrSessionManager) {
    root->push(Screen{"home"});
    sessions->endSync();
    EXPECT_EQ(submit<ScreenView>(root), "! there is no active session");
    sessions->start(Session::Kind::realtime());
    EXPECT_EQ(submit<ScreenView>(root), R"({"screen":{"name":"home"}})");
    const auto child = root->chain("late");
    sessions.reset();
    EXPECT_EQ(submit<ScreenView>(child), "! there is no active session");
}

TEST_F(Submission, SurvivesACompletionThatThrows) {
    root->push(Screen{"home"});
    root->submit<ScreenView>([](const EventSubmitResult&) { throw 1; });
    EXPECT_EQ(submit<ScreenView>(root), R"({"screen":{"name":"home"}})");
}

}  // namespace
}  // namespace corvane::test
