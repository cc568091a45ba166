#include <corvane/Tracker/SessionObserver.h>

#include <corvane/Processing/LoggingEventProcessor.h>

#include "tests/support/CapturedLog.h"
#include "tests/support/TrackingFixture.h"

#include <algorithm>
#include <array>

namespace corvane::test {
namespace {

using namespace std::chrono_literals;

class Handles : public TrackingTest {
  protected:
    struct Mark {};
};

TEST_F(Handles, ATransactionRunsInlineAndSurvivesWhatItsBlockThrows) {
    std::vector<std::string> order;
    root->submit<Mark>([&](const EventSubmitResult&) { order.emplace_back("before"); });
    root->transaction([&](AccessTracker& access) {
        access.push(Screen{"inside"});
        access.submit<ScreenView>([&](const EventSubmitResult& result) { order.push_back(result.event()->name()); });
        order.emplace_back("end");
        access.pop<Screen>();
        throw std::runtime_error("x");
    });
    root->submit<Mark>([&](const EventSubmitResult&) { order.emplace_back("after"); });
    processor->drain();
    EXPECT_EQ(order, (std::vector<std::string>{"before", "ScreenView", "end", "after"}));
}

TEST_F(Handles, ADelayedSubmissionCarriesTheTimeOfTheCallAndGoesOutOnce) {
    const Date before = now();
    const auto token = root->delayedSubmit<Identified>();
    const Date after = now();
    while (now() < after + 5ms) {
    }
    processor->drain();
    EXPECT_TRUE(processor->events.empty());
    EXPECT_FALSE(token->sealed());
    token->commit();
    token->commit();
    processor->drain();
    ASSERT_EQ(processor->events.size(), 1u);
    const auto time = *processor->events[0].json()["event"]["eventTimestamp"].integer();
    EXPECT_GE(time, millisecondsSince1970(before));
    EXPECT_LE(time, millisecondsSince1970(after));

    auto child = root->chain("child");
    std::weak_ptr<Tracker> weak = child;
    bool called = false;
    const auto orphan = child->delayedSubmit<Mark>([&](const EventSubmitResult&) { called = true; });
    processor->drain();
    child.reset();
    EXPECT_TRUE(weak.expired()) << "a token does not keep its tracker";
    orphan->commit();
    processor->drain();
    EXPECT_FALSE(called);
    EXPECT_TRUE(orphan->sealed());
}

TEST_F(Handles, WhenSessionRunsOnceNowOrWithTheNextStart) {
    int now = 0, later = 0;
    root->whenSession([&](AccessTracker&) { ++now; });
    processor->drain();
    EXPECT_EQ(now, 1);
    sessions->endSync();
    root->whenSession([&](AccessTracker& access) {
        ++later;
        access.submit<Mark>();
        throw 1;
    });
    processor->drain();
    EXPECT_EQ(later, 0);
    for (int i = 0; i < 2; ++i) {
        sessions->start(Session::Kind::userEvents());
        sessions->endSync();
    }
    EXPECT_EQ(later, 1);
    EXPECT_EQ(processor->events.size(), 1u);
}

TEST_F(Handles, BlocksThatRunOnceLetGoOfWhatTheyHold) {
    auto held = std::make_shared<int>();
    const auto token = root->delayedSubmit<Mark>([held](const EventSubmitResult&) {});
    token->commit();
    root->whenSession([held](AccessTracker&) {});
    sessions->endSync();
    root->whenSession([held](AccessTracker&) {});
    sessions->start(Session::Kind::userEvents());
    processor->drain();
    EXPECT_EQ(held.use_count(), 1);
}

TEST_F(Handles, EverythingMayBeUsedAfterTheSessionManagerIsGone) {
    const auto child = root->chain("child");
    const auto token = child->delayedSubmit<Mark>();
    const auto observer = child->onSessionChange([](AccessTracker&, SessionChange) {});
    sessions.reset();
    processor->drain();
    int called = 0;
    child->whenSession([&](AccessTracker&) { ++called; });
    child->transaction([&](AccessTracker& access) {
        ++called;
        access.push(Screen{"x"});
        access.time<Mark>(true);
    });
    child->enterGroup("g");
    child->leaveGroup();
    child->suspend();
    child->resume();
    token->commit();
    observer->disposeOn(std::make_shared<int>());
    child->removeSessionObservers(child);
    EXPECT_EQ(child->snapshot(SnapshotPolicy::now)->evaluate<ScreenView>().isValid, true);
    EXPECT_EQ(called, 1) << "the transaction";
    EXPECT_EQ(submit<Mark>(child->chain("late")), "! there is no active session");
}

class QueueWatch final : public LoggingEventProcessorFormatterType {
  public:
    explicit QueueWatch(std::function<void()> look) : look_(std::move(look)) {}
    std::string format(const ProcessEvent& event) const override {
        look_();
        return event.name();
    }

  private:
    std::function<void()> look_;
};

TEST_F(Handles, EveryBlockOfTheHostRunsOnTheQueue) {
    CapturedLog log;
    int seen = 0, astray = 0;
    const auto look = [&] { ++(processor->isOnQueue() ? seen : astray); };
    sessions->processorManager()->add(std::make_shared<LoggingEventProcessor>(
        LoggingEventProcessorFormat::custom(std::make_shared<QueueWatch>(look))));
    root->onSessionChange([&](AccessTracker&, SessionChange) { look(); });
    root->whenSession([&](AccessTracker&) { look(); });
    root->transaction([&](AccessTracker&) { look(); });
    sessions->transaction([&](AccessSessionManager&) { look(); });
    root->submit<Mark>([&](const EventSubmitResult&) { look(); });
    root->delayedSubmit<Mark>([&](const EventSubmitResult&) { look(); })->commit();
    sessions->endSync();
    root->whenSession([&](AccessTracker&) { look(); });
    sessions->start(Session::Kind::userEvents());
    sessions->end(look);
    processor->drain();
    EXPECT_EQ(astray, 0);
    EXPECT_EQ(seen, 7 + 2 + 6) << "seven blocks of one call, two lines formatted, six session changes";
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
        for (const int next : order) {
            switch (next) {
                case 0:
                    manager.reset();
                    break;
                case 1:
                    parent.reset();
                    break;
                case 2:
                    child.reset();
                    break;
                case 3:
                    observer.reset();
                    break;
                case 4:
                    token.reset();
                    break;
                default:
                    access.reset();
            }
            if (token) token->commit();
            if (observer) observer->disposeOn(std::weak_ptr<const void>());
            if (access) (void)access->tracker();
            if (manager) manager->end();
            if (child) child->submit<Mark>(), child->push(Screen{"x"});
            if (parent) parent->enterGroup("g"), parent->submit<Mark>();
        }
        // What was enqueued holds them until it has run: the queue's end is the trackers' end.
        recorder->drain();
        ASSERT_TRUE(weakChild.expired() && weakParent.expired());
    } while (std::next_permutation(order.begin(), order.end()));
}

TEST_F(Handles, LongChainsManyObserversDeepGroupsAndManyTimersWork) {
    auto tracker = root;
    for (int i = 0; i < 200000; ++i) tracker = tracker->chain("t");
    root->push(Screen{"root"});
    EXPECT_EQ(submit<ScreenView>(tracker), R"({"screen":{"name":"root"}})");
    EXPECT_EQ(tracker->path().size(), 200001u);
    tracker = root->chain("t");  // the others are released
    processor->drain();

    int changes = 0;
    for (int i = 0; i < 10000; ++i) root->onSessionChange([&](AccessTracker&, SessionChange) { ++changes; });
    sessions->endSync();
    EXPECT_EQ(changes, 20000);
    sessions->start(Session::Kind::userEvents());

    for (int i = 0; i < 1000; ++i) root->enterGroup(std::to_string(i));
    for (int i = 0; i < 400; ++i) tracker->leaveGroup();
    submit<ScreenView>(tracker);
    EXPECT_EQ(processor->events.back().groupName(), "599");

    struct Named : EventDeclaration {
        explicit Named(std::string text)
            : EventDeclaration{{},
                               [](const EventDeclaration&, EventMirrorStore& store) {
                                   return detail::propertiesOf<Played>(detail::declarationOf<Played>, store);
                               }},
              owned(std::move(text)) {
            name = owned;
        }
        std::string owned;
    };
    const auto timed = [](int i) { return EventSubmit(std::make_shared<Named>("timed" + std::to_string(i))); };
    for (int i = 0; i < 10000; ++i) root->time(timed(i), Date(1s), false);
    std::string outcome;
    root->submit(timed(7777), Date(3s), {.completion = [&](const EventSubmitResult& result) {
                     outcome = result.event()->json()["span"]["duration"].text();
                 }});
    processor->drain();
    EXPECT_EQ(outcome, "2000");
}

}  // namespace
}  // namespace corvane::test
