#include "tests/support/TrackingFixture.h"

#include <regex>

namespace corvane::test {
namespace {

class Submission : public TrackingTest {};

TEST_F(Submission, IsStampedWithTimePathAndSession) {
    struct Twice {
        EventProperty<EventData> first = required;
        EventProperty<EventData> second = required;
    };
    const auto tracker = root->chain("b")->chain("c");
    EXPECT_EQ(tracker->path(), (std::vector<std::string>{"root", "b", "c"}));
    const JSON twice(submit<Twice>(tracker));
    const JSON event = twice["first"];
    EXPECT_EQ(event.text(), twice["second"].text()) << "one identity for each submission";
    EXPECT_TRUE(std::regex_match(*event["eventID"].string(),
                                 std::regex("[0-9A-F]{8}-[0-9A-F]{4}-4[0-9A-F]{3}-[89AB][0-9A-F]{3}-[0-9A-F]{12}")));
    EXPECT_EQ(event["eventPath"].string(), "/root/b/c");
    EXPECT_EQ(event["sessionID"].string(), processor->sessions().at(0).identifier);

    tracker->explicitSubmit<Identified>(Date(1500ms));
    EXPECT_EQ(processor->events().at(1).json()["event"]["eventTimestamp"].integer(), 1500);
}

TEST_F(Submission, TakesTheTimeOfTheCallNotOfTheQueue) {
    std::promise<void> release;
    sessions->transaction([&](AccessSessionManager&) { release.get_future().wait(); });
    const Date before = now();
    root->submit<Identified>();
    const Date called = now();
    while (now() < called + 20ms) {
    }
    release.set_value();
    const auto time = processor->events().at(0).json()["event"]["eventTimestamp"].integer();
    EXPECT_GE(time, millisecondsSince1970(before));
    EXPECT_LE(time, millisecondsSince1970(called));
}

struct Three {
    EventProperty<Screen> first = required;
    EventProperty<int> number = required;
    EventProperty<Viewer> second = required;
    std::string note = "not a property";
};
TEST_F(Submission, ListsEveryMissingPropertyInDeclarationOrder) {
    std::optional<TrackerError> error;
    root->submit<Three>([&](const EventSubmitResult& result) { error = *result.error()->as<TrackerError>(); });
    processor->settle();
    EXPECT_EQ(error->missingData().at(1), (TrackerError::MissingData{"number", DataType::of<int>(), "int"}));
    EXPECT_STREQ(error->what(), "required data is missing: first (Screen) number (int) second (Viewer)");
    EXPECT_TRUE(processor->events().empty());
}

}  // namespace
}  // namespace corvane::test
