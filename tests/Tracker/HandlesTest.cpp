#include <corvane/Processing/LoggingEventProcessor.h>
#include <corvane/Tracker/SessionObserver.h>

#include "tests/support/TrackingFixture.h"

#include <array>

namespace corvane::test {
namespace {

class Handles : public TrackingTest {
  protected:
    struct Mark {};
};

TEST_F(Handles, ADelayedSubmissionCarriesTheTimeOfTheCallAndGoesOutOnce) {
    const auto token = root->delayedSubmit<Identified>();
    const Date after = now();
    while (now() < after + 5ms) {
    }
    EXPECT_TRUE(processor->events().empty());
    token->commit();
    token->commit();
    ASSERT_EQ(processor->events().size(), 1u);
    EXPECT_LE(processor->events()[0].json()["event"]["eventTimestamp"].integer(), millisecondsSince1970(after));

    auto child = root->chain("child");
    std::weak_ptr<Tracker> weak = child;
    bool called = false;
    const auto orphan = child->delayedSubmit<Mark>([&](const EventSubmitResult&) { called = true; });
    processor->settle();
    child.reset();
    EXPECT_TRUE(weak.expired()) << "a token does not keep its tracker";
    orphan->commit();
    processor->settle();
    EXPECT_FALSE(called);
    EXPECT_TRUE(orphan->sealed());
}

TEST_F(Handles, BlocksThatRunOnceLetGoOfWhatTheyHold) {
    auto held = std::make_shared<int>();
    const auto token = root->delayedSubmit<Mark>([held](const EventSubmitResult&) {});
    token->commit();
    root->whenSession([held](AccessTracker&) {});
    sessions->endSync();
    root->whenSession([held](AccessTracker&) {});
    sessions->start(Session::Kind::userEvents());
    processor->settle();
    EXPECT_EQ(held.use_count(), 1);
}

TEST_F(Handles, MayBeReleasedInEveryOrder) {
    std::array<int, 6> order{0, 1, 2, 3, 4, 5};
    do {
        auto manager = std::make_unique<SessionManager>();
        const auto recorder = std::make_shared<RecordingProcessor>();
        manager->processorManager()->add(recorder);
        manager->start(Session::Kind::userEvents());
        auto parent = manager->tracker()->chain("parent");
        auto child = parent->chain("child");
        std::weak_ptr<Tracker> weakChild = child, weakParent = parent;
        auto observer = child->onSessionChange([](AccessTracker& access, SessionChange) { access.submit<Mark>(); });
        auto token = child->delayedSubmit<Mark>();
        auto access = std::make_unique<AccessTracker>(child);
        const auto processors = manager->processorManager();
        const std::function<void()> releases[] = {[&] { manager.reset(); }, [&] { parent.reset(); },
                                                  [&] { child.reset(); },   [&] { observer.reset(); },
                                                  [&] { token.reset(); },   [&] { access.reset(); }};
        for (const int next : order) {
            releases[next]();
            if (token) token->commit();
            if (observer) observer->disposeOn(std::weak_ptr<const void>());
            if (access) (void)access->tracker();
            if (manager) manager->end();
            processors->add(std::make_shared<LoggingEventProcessor>());
            processors->remove(recorder);
            processors->add(recorder);
            processors->resumeBackgroundProcessing("another", {});
            if (child) child->submit<Mark>(), child->push(Screen{"x"}), child->time<Played>(true);
            if (child) child->whenSession([](AccessTracker&) {}), child->suspend(), child->resume();
            if (parent) parent->enterGroup("g"), parent->submit<Mark>();
        }
        // What was enqueued holds them until it has run: the queue's end is the trackers' end.
        recorder->settle();
        ASSERT_TRUE(weakChild.expired() && weakParent.expired());
    } while (std::next_permutation(order.begin(), order.end()));
}

TEST_F(Handles, LongChainsManyObserversAndDeepGroupsWork) {
    auto tracker = root;
    for (int i = 0; i < 200000; ++i) tracker = tracker->chain("t");
    root->push(Screen{"root"});
    EXPECT_EQ(submit<ScreenView>(tracker), R"({"screen":{"name":"root"}})");
    tracker = root->chain("t");  // the others are released
    processor->settle();

    int changes = 0;
    for (int i = 0; i < 10000; ++i) root->onSessionChange([&](AccessTracker&, SessionChange) { ++changes; });
    sessions->endSync();
    EXPECT_EQ(changes, 20000);
    sessions->start(Session::Kind::userEvents());

    for (int i = 0; i < 1000; ++i) root->enterGroup(std::to_string(i));
    for (int i = 0; i < 400; ++i) tracker->leaveGroup();
    submit<ScreenView>(tracker);
    EXPECT_EQ(processor->events().back().groupName(), "599");
}

}  // namespace
}  // namespace corvane::test
