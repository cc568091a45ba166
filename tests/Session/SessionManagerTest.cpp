#include <corvane/Session/ActiveSession.h>
#include <corvane/Tracker/SessionObserver.h>

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

class Observers : public TrackingTest {
  protected:
    Observers() { sessions->endSync(); }

    std::shared_ptr<SessionObserver> observe(const std::shared_ptr<Tracker>& tracker) {
        return tracker->onSessionChange(
            [this](AccessTracker&, SessionChange change) { seen.push_back(static_cast<int>(change)); });
    }

    std::vector<int> seen;
};

TEST_F(Observers, EndWithTheirTrackerTheObjectTheyAreGivenOrARemoval) {
    const auto seenInOneSession = [this] {
        seen.clear();
        sessions->start(Session::Kind::userEvents());
        sessions->endSync();
        return seen;
    };
    auto child = root->chain("child");
    auto owner = std::make_shared<int>();
    const auto first = observe(child);
    const auto second = observe(child);
    second->disposeOn(owner);
    child.reset();
    EXPECT_EQ(seenInOneSession(), (std::vector<int>{0, 1, 2, 3})) << "only the one that was given another owner";
    owner.reset();
    second->disposeOn(root);
    EXPECT_EQ(seenInOneSession(), std::vector<int>())
        << "one whose owner has gone stays over, whatever it is bound to later";
    observe(root);
    root->removeSessionObservers(root);
    const auto pair = std::make_shared<std::pair<int, int>>();
    observe(root)->disposeOn(pair);
    root->removeSessionObservers(std::shared_ptr<int>(pair, &pair->second));  // another address, the same owner
    EXPECT_EQ(seenInOneSession(), std::vector<int>());
}

struct Mark {};

using Lifetime = TrackingTest;

TEST_F(Lifetime, EverythingCalledBeforeDestructionStillReachesTheProcessorsWhereverItHappens) {
    for (const std::string way : {"here", "another thread", "a completion", "suspended"}) {
        const auto recorder = std::make_shared<RecordingProcessor>();
        auto manager = std::make_unique<SessionManager>();
        const auto tracker = manager->tracker();
        manager->processorManager()->add(recorder);
        manager->start(Session::Kind::userEvents());
        std::promise<void> release, started;
        std::unique_ptr<AccessSessionManager> kept;  // which holds what the manager was made of
        manager->transaction([&](AccessSessionManager& access) {
            kept = std::make_unique<AccessSessionManager>(access);
            started.set_value();
            release.get_future().wait();
        });
        started.get_future().wait();
        std::atomic<int> succeeded = 0, failed = 0;
        const auto count = [&](const EventSubmitResult& result) { ++(result.succeeded() ? succeeded : failed); };
        for (int i = 0; i < 10000; ++i) {
            tracker->submit<Mark>([&, i](const EventSubmitResult& result) {
                count(result);
                if (i == 100 && way == "a completion") manager.reset();
            });
        }
        if (way == "here") manager.reset();
        if (way == "another thread") std::thread([&] { manager.reset(); }).join();
        if (way == "suspended") {
            tracker->suspend();
            tracker->suspend();
            std::thread([&] { manager.reset(); }).join();
            tracker->resume();
            tracker->suspend();
        }
        if (way != "a completion") tracker->submit<Mark>(count);
        release.set_value();
        recorder->settle();
        recorder->settle();  // behind the end of the manager too
        EXPECT_EQ(succeeded, 10000) << way;
        EXPECT_EQ(failed, way == "a completion" ? 0 : 1) << way;
        EXPECT_EQ(recorder->events().size(), 10000u) << way;
        EXPECT_EQ(recorder->history().back(), "process Mark") << "no session is ended behind the host's back";
    }
}

}  // namespace
}  // namespace corvane::test
