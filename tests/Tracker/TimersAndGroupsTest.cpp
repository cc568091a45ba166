#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

using namespace std::chrono_literals;

class Timers : public TrackingTest {
  protected:
    std::optional<std::int64_t> duration(std::size_t index) {
        return processor->events.at(index).json()["span"]["duration"].integer();
    }
};

TEST_F(Timers, GiveTheEventTheSpanSinceTheFirstStartAndEnd) {
    const Date start(1h);
    root->explicitTime<Played>(start);
    root->explicitTime<Played>(start + 1s);
    root->explicitSubmit<Played>(start + 1500ms);
    processor->drain();
    EXPECT_EQ(processor->events.at(0).json().text(),
              R"({"span":{"startTimestamp":3600000,"endTimestamp":3601500,"duration":1500}})");
    EXPECT_EQ(submit<Played>(root), "! required data is missing: span (TimedData)");
}

TEST_F(Timers, BelongToOneTracker) {
    root->time<Played>();
    EXPECT_EQ(submit<Played>(root->chain("child")), "! required data is missing: span (TimedData)");
}

TEST_F(Timers, DropAnOnlyIfTimedSubmissionWithoutOneInSilence) {
    struct Untimed {};
    bool called = false;
    const SubmitOptions options{.onlyIfTimed = true, .completion = [&](const EventSubmitResult&) { called = true; }};
    root->submit<Untimed>(options);
    processor->drain();
    EXPECT_FALSE(called);
    root->time<Untimed>();
    root->submit<Untimed>(options);
    root->submit<Untimed>(options);
    processor->drain();
    EXPECT_TRUE(called);
    EXPECT_EQ(processor->events.size(), 2u) << "an event without TimedData leaves the timer running";
    sessions->endSync();
    called = false;
    root->chain("untimed")->submit<Untimed>(options);
    processor->drain();
    EXPECT_TRUE(called) << "without a session the submission fails before the timer is looked at";
}

TEST_F(Timers, ThatRestartFollowTheSession) {
    const auto child = root->chain("child");
    root->time<Played>(true);
    child->time<Played>(true);
    sessions->endSync();
    ASSERT_EQ(processor->events.size(), 1u) << "the root has no observer: its timer is a plain one";
    EXPECT_EQ(processor->calls.back(), "end") << "the event belongs to the session that ends";
    EXPECT_GE(*duration(0), 0);

    sessions->start(Session::Kind::userEvents());
    processor->drain();
    child->explicitSubmit<Played>(now() + 5s);
    processor->drain();
    EXPECT_GE(*duration(1), 4900);
    sessions->endSync();
    sessions->start(Session::Kind::userEvents());
    sessions->endSync();
    EXPECT_EQ(processor->events.size(), 2u) << "the host's submission ended the timer for good";
}

TEST_F(Timers, GroupsNestAndAreFoundAndLeftThroughTheChain) {
    struct Mark {};
    const auto child = root->chain("child");
    const auto group = [&](const std::shared_ptr<Tracker>& tracker) {
        submit<Mark>(tracker);
        return processor->events.back().groupName().value_or("-");
    };
    EXPECT_EQ(group(child), "-");
    root->enterGroup("a");
    root->enterGroup("b");
    EXPECT_EQ(group(child), "b");
    child->enterGroup("c");
    EXPECT_EQ(group(child), "c");
    EXPECT_EQ(group(root), "b");
    child->leaveGroup();
    child->leaveGroup();
    EXPECT_EQ(group(child), "a") << "the second leave took the parent's innermost group";
    child->leaveGroup();
    child->leaveGroup();
    EXPECT_EQ(group(child), "-");
    std::erase_if(processor->calls, [](const auto& call) { return call.find(' ') == call.npos || call[0] == 'p'; });
    EXPECT_EQ(processor->calls,
              (std::vector<std::string>{"enter a", "enter b", "enter c", "leave c", "leave b", "leave a"}));
}

}  // namespace
}  // namespace corvane::test
