#include <corvane/Session/ActiveSession.h>

#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

using SessionManagerTest = TrackingTest;

TEST_F(SessionManagerTest, StartsAndEndsInTurnsAndIgnoresWhatDoesNotFit) {
    sessions->start(Session::Kind::telemetry());
    sessions->endSync();
    bool completed = false;
    sessions->end([&] { completed = true; });
    processor->settle();
    EXPECT_TRUE(completed);
    sessions->start(Session::Kind::custom("kiosk"));
    EXPECT_EQ(processor->history(), (std::vector<std::string>{"start", "end", "start"}));
    EXPECT_EQ(processor->sessions()[0].kind, Session::Kind::userEvents());
    EXPECT_EQ(processor->sessions()[0].identifier, processor->sessions()[1].identifier);
    EXPECT_NE(processor->sessions()[1].identifier, processor->sessions()[2].identifier);
    EXPECT_EQ(processor->sessions()[2].kind, Session::Kind::custom("kiosk"));
}

TEST_F(SessionManagerTest, DatesAreThoseOfTheCalls) {
    std::promise<void> release;
    sessions->endSync();
    sessions->transaction([&](AccessSessionManager&) { release.get_future().wait(); });
    const Date before = now();
    sessions->start(Session::Kind::userEvents());
    root->submit<Identified>();
    sessions->end();
    const Date after = now();
    while (now() < after + 5ms) {
    }
    release.set_value();
    EXPECT_GE(processor->sessions().back().startDate, before);
    EXPECT_LE(processor->sessions().back().startDate, after);
    EXPECT_LE(processor->endDates().back(), after);
    const auto time = *processor->events().at(0).json()["event"]["eventTimestamp"].integer();
    EXPECT_GE(time, millisecondsSince1970(before));
    EXPECT_LE(time, millisecondsSince1970(after));
}

TEST_F(SessionManagerTest, EndSyncDoesNothingWhileSuspended) {
    root->suspend();
    root->suspend();
    sessions->endSync();
    root->resume();
    sessions->endSync();
    root->resume();
    EXPECT_EQ(processor->history(), (std::vector<std::string>{"start"}));
    sessions->endSync();
    EXPECT_EQ(processor->history().back(), "end");
}

TEST(ActiveSession, KeepsItsLatestEventsAndCountsAll) {
    ActiveSession session("id", Session::Kind::userEvents(), Date());
    const std::size_t all = ActiveSession::keptEvents + 2;
    for (std::size_t i = 0; i < all; ++i) session.append({std::to_string(i), JSON("{}"), std::nullopt});
    EXPECT_EQ(session.eventCount(), all);
    EXPECT_EQ(session.events().size(), ActiveSession::keptEvents);
    EXPECT_EQ(session.events().front().name(), "2");
    EXPECT_EQ(session.events().back().name(), std::to_string(all - 1));
}

}  // namespace
}  // namespace corvane::test
