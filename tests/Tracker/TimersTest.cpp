#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

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
