#include "tests/support/TrackingFixture.h"

#include <future>

namespace corvane::test {
namespace {

using namespace std::chrono_literals;

struct Device {
    std::string model;
};

class SessionManagerTest : public TrackingTest {
  protected:
    std::string lastData() {
        processor->drain();
        JSON::Object data = *processor->sessions.back().sessionData.object();
        EXPECT_EQ(data.at("sessionID").string(), processor->sessions.back().identifier);
        std::string text;
        for (const auto& [key, value] : data) {
            if (key != "sessionID") text += key + "=" + value.text() + " ";
        }
        return text;
    }
};

TEST_F(SessionManagerTest, StartsAndEndsInTurnsAndIgnoresWhatDoesNotFit) {
    sessions->start(Session::Kind::telemetry());
    sessions->endSync();
    bool completed = false;
    sessions->end([&] { completed = true; });
    processor->drain();
    EXPECT_TRUE(completed);
    sessions->start(Session::Kind::custom("kiosk"));
    processor->drain();
    EXPECT_EQ(processor->calls, (std::vector<std::string>{"start", "end", "start"}));
    EXPECT_EQ(processor->sessions[0].kind, Session::Kind::userEvents());
    EXPECT_EQ(processor->sessions[0].identifier, processor->sessions[1].identifier);
    EXPECT_NE(processor->sessions[1].identifier, processor->sessions[2].identifier);
    EXPECT_EQ(processor->sessions[2].kind, Session::Kind::custom("kiosk"));
}

TEST_F(SessionManagerTest, DatesAreThoseOfTheCalls) {
    std::promise<void> release;
    sessions->endSync();
    sessions->transaction([&](AccessSessionManager&) { release.get_future().wait(); });
    const Date before = now();
    sessions->start(Session::Kind::userEvents());
    sessions->end();
    const Date after = now();
    while (now() < after + 5ms) {
    }
    release.set_value();
    processor->drain();
    EXPECT_GE(processor->sessions.back().startDate, before);
    EXPECT_LE(processor->sessions.back().startDate, after);
    EXPECT_LE(processor->endDates.back(), after);
}

TEST_F(SessionManagerTest, DataWaitsForASessionAndIsAnnouncedInOne) {
    sessions->endSync();
    sessions->push(SessionData{"device", Device{"M1"}});
    sessions->start(Session::Kind::userEvents());
    EXPECT_EQ(lastData(), R"(device={"model":"M1"} )");
    sessions->push(SessionData{"user", Viewer{"7", {}}}, {}, true);
    EXPECT_EQ(lastData(), R"(device={"model":"M1"} user={"id":"7"} )");
    EXPECT_EQ(processor->calls.back(), "update+submit");
}

TEST_F(SessionManagerTest, DataOfOneTypeSharesAStackAndOnceOnlyDataEndsWithItsSession) {
    sessions->push(SessionData{"a", Device{"old"}});
    sessions->push(SessionData{"b", Device{"new"}}, {DataEventTrait::onlyOnce});
    EXPECT_EQ(lastData(), R"(b={"model":"new"} )");
    sessions->endSync();
    EXPECT_EQ(lastData(), R"(b={"model":"new"} )") << "the ending session still carries it";
    sessions->start(Session::Kind::userEvents());
    EXPECT_EQ(lastData(), R"(a={"model":"old"} )");
}

TEST_F(SessionManagerTest, DataThatFailsOrClashesLeavesTheRestAlone) {
    struct Failing {
        JSON toDict() const { throw std::runtime_error("no"); }
    };
    sessions->push(SessionData{"failing", Failing{}});
    sessions->push(SessionData{"sessionID", Device{"M1"}});
    sessions->push(SessionData{"user", Viewer{"7", {}}});
    EXPECT_EQ(lastData(), R"(user={"id":"7"} )");
}

TEST_F(SessionManagerTest, EndSyncDoesNothingWhileSuspended) {
    root->suspend();
    root->suspend();
    sessions->endSync();
    root->resume();
    sessions->endSync();
    root->resume();
    processor->drain();
    EXPECT_EQ(processor->calls, (std::vector<std::string>{"start"}));
    sessions->endSync();
    EXPECT_EQ(processor->calls.back(), "end");
}

TEST_F(SessionManagerTest, TransactionsSeeAndChangeTheSessionInline) {
    sessions->endSync();
    sessions->start(Session::Kind::userEvents());
    bool active = false;
    std::size_t callsInside = 0;
    sessions->transaction([&](AccessSessionManager& access) {
        active = access.isActive();
        access.push(SessionData{"device", Device{"M1"}});
        callsInside = processor->calls.size();
        throw std::runtime_error("ignored");
    });
    processor->drain();
    EXPECT_TRUE(active);
    EXPECT_EQ(callsInside, processor->calls.size());
    EXPECT_EQ(processor->calls.back(), "update");
}

TEST_F(SessionManagerTest, EndSyncFromTheQueueIsAProgrammingError) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_DEATH(
        {
            sessions->transaction([&](AccessSessionManager&) { sessions->endSync(); });
            processor->drain();
        },
        "SessionManager::endSync must not be called on queue com.veskar.corvane.event-tracker");
}

}  // namespace
}  // namespace corvane::test
