#include "tests/support/TrackingFixture.h"

#include <regex>

namespace corvane::test {
namespace {

using Submission = TrackingTest;
using Stacks = TrackingTest;

TEST_F(Submission, IsStampedWithTimePathAndSession) {
    struct Twice {
        EventProperty<EventData> first = required;
        EventProperty<EventData> second = required;
        std::string note = "not a property";
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

namespace other {
struct Screen {
    int number;
};
}  // namespace other

TEST_F(Stacks, APushOfAnotherTypeUnderTheSameNameReplacesTheStack) {
    CapturedLog log;
    root->push(Screen{"A"});
    root->push(other::Screen{7});
    EXPECT_EQ(submit<ScreenView>(root), R"({"screen":{"number":7}})");
    EXPECT_EQ(submit<ScreenView>(root->chain("child")), R"({"screen":{"number":7}})");
    ASSERT_EQ(log.lines().size(), 1u) << "said once";
    EXPECT_TRUE(
        log.lines()[0].message.ends_with("property=screen, declared=corvane::test::Screen, "
                                         "found=corvane::test::(anonymous namespace)::other::Screen"));
    root->pop<Screen>();
    EXPECT_EQ(submit<ScreenView>(root), R"({"screen":{"number":7}})") << "a pop of the other type does nothing";
    root->pop<other::Screen>();
    EXPECT_EQ(submit<ScreenView>(root), "! required data is missing: screen (Screen)");
}

// Data that pushes when it goes, as a host's handle on some resource may.
struct Parting {
    std::shared_ptr<void> farewell;
    void encode(Encoder& encoder) const {
        encoder.beginObject();
        encoder.endObject();
    }
};
struct PartingView {
    EventProperty<Parting> parting = required;
};
namespace other {
struct Parting {
    std::string left;
};
}  // namespace other

TEST_F(Stacks, DataMayPushWhileItsStackIsEmptied) {
    int farewells = 0;
    const auto parting = [&](const AccessTracker& access, auto successor) {
        return Parting{std::shared_ptr<void>(&farewells, [=](int* count) {
            ++*count;
            for (int i = 0; i < 100; ++i) access.push(successor);
        })};
    };
    root->transaction([&](AccessTracker& access) {
        for (int i = 0; i < 100; ++i) access.push(parting(access, Parting{}));
        access.push(Parting{}, {DataEventTrait::unique});
        access.push(parting(access, Parting{}));
        access.push(other::Parting{"kind"});  // the stack becomes one of another kind, and back again
        access.push(parting(access, other::Parting{"last"}));
        access.push(parting(access, other::Parting{"never"}), {DataEventTrait::onlyOnce});
        access.pop<Parting>();
    });
    EXPECT_EQ(submit<PartingView>(root), R"({"parting":{"left":"never"}})");
    sessions->transaction([&](AccessSessionManager& access) {
        const auto keep = std::make_shared<AccessSessionManager>(access);
        const auto farewell = [keep, &farewells](int*) {
            ++farewells;
            for (int i = 0; i < 100; ++i) keep->push(SessionData{"k", other::Parting{"late"}});
        };
        access.push(SessionData{"k", Parting{{&farewells, farewell}}}, {DataEventTrait::onlyOnce});
    });
    sessions->endSync();
    EXPECT_EQ(farewells, 104);
}

class Timers : public TrackingTest {
  protected:
    std::optional<std::int64_t> duration(std::size_t index) {
        return processor->events().at(index).json()["span"]["duration"].integer();
    }
};

TEST_F(Timers, DropAnOnlyIfTimedSubmissionWithoutOneInSilence) {
    struct Untimed {};
    bool called = false;
    const SubmitOptions options{.onlyIfTimed = true, .completion = [&](const EventSubmitResult&) { called = true; }};
    root->submit<Untimed>(options);
    processor->settle();
    EXPECT_FALSE(called);
    root->time<Untimed>();
    root->submit<Untimed>(options);
    root->submit<Untimed>(options);
    processor->settle();
    EXPECT_TRUE(called);
    EXPECT_EQ(processor->events().size(), 2u) << "an event without TimedData leaves the timer running";
    sessions->endSync();
    called = false;
    root->chain("untimed")->submit<Untimed>(options);
    processor->settle();
    EXPECT_TRUE(called) << "without a session the submission fails before the timer is looked at";
}

TEST_F(Timers, ThatRestartFollowTheSession) {
    const auto child = root->chain("child");
    root->time<Played>(true);
    child->time<Played>(true);
    sessions->endSync();
    ASSERT_EQ(processor->events().size(), 1u) << "the root has no observer: its timer is a plain one";
    EXPECT_EQ(processor->history().back(), "end") << "the event belongs to the session that ends";
    EXPECT_GE(*duration(0), 0);

    sessions->start(Session::Kind::userEvents());
    processor->settle();
    child->explicitSubmit<Played>(now() + 5s);
    processor->settle();
    EXPECT_GE(*duration(1), 4900);
    sessions->endSync();
    sessions->start(Session::Kind::userEvents());
    sessions->endSync();
    EXPECT_EQ(processor->events().size(), 2u) << "the host's submission ended the timer for good";
}

}  // namespace
}  // namespace corvane::test
