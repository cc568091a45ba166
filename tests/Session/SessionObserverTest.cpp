#include <corvane/Tracker/SessionObserver.h>

#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

class Observers : public TrackingTest {
  protected:
    Observers() { sessions->endSync(); }

    std::shared_ptr<SessionObserver> observe(const std::shared_ptr<Tracker>& tracker) {
        return tracker->onSessionChange(
            [this](AccessTracker&, SessionChange change) { seen.push_back(static_cast<int>(change)); });
    }

    std::vector<int> seen;
};

TEST_F(Observers, SeeEveryChangeOnceInOrder) {
    observe(root);
    sessions->start(Session::Kind::userEvents());
    sessions->endSync();
    EXPECT_EQ(seen, (std::vector<int>{0, 1, 2, 3}));
}

TEST_F(Observers, EndWithTheirTrackerTheObjectTheyAreGivenOrARemoval) {
    const auto seenInOneSession = [this] {
        seen.clear();
        sessions->start(Session::Kind::userEvents());
        sessions->endSync();
        return seen.size();
    };
    auto child = root->chain("child");
    auto owner = std::make_shared<int>();
    const auto first = observe(child);
    const auto second = observe(child);
    second->disposeOn(owner);
    child.reset();
    EXPECT_EQ(seenInOneSession(), 4u) << "only the one that was given another owner";
    owner.reset();
    second->disposeOn(root);
    EXPECT_EQ(seenInOneSession(), 0u) << "one whose owner has gone stays over, whatever it is bound to later";
    observe(root);
    root->removeSessionObservers(root);
    const auto pair = std::make_shared<std::pair<int, int>>();
    observe(root)->disposeOn(pair);
    root->removeSessionObservers(std::shared_ptr<int>(pair, &pair->second));  // another address, the same owner
    EXPECT_EQ(seenInOneSession(), 0u);
}

TEST_F(Observers, MaySubmitAndPushInlineAndMayThrow) {
    std::string outcome;
    root->onSessionChange([](AccessTracker&, SessionChange) { throw std::runtime_error("x"); });
    root->onSessionChange([&](AccessTracker& access, SessionChange change) {
        if (change != SessionChange::didStart) return;
        access.push(Screen{"first"});
        access.submit<ScreenView>([&](const EventSubmitResult& result) { outcome = result.event()->json().text(); });
        EXPECT_EQ(outcome, R"({"screen":{"name":"first"}})");
        access.pop<Screen>();
    });
    sessions->start(Session::Kind::userEvents());
    EXPECT_EQ(submit<ScreenView>(root), "! required data is missing: screen (Screen)");
    EXPECT_FALSE(outcome.empty());
}

TEST_F(Observers, DoNotKeepTheirTrackerAndItsHandleTurnsIntoNothing) {
    auto child = root->chain("child");
    const AccessTracker handle(child);
    const std::weak_ptr<Tracker> weak = child;
    const auto observer = observe(child);
    child.reset();
    processor->settle();
    EXPECT_TRUE(weak.expired());
    handle.push(Screen{"x"});
    handle.submit<ScreenView>([&](const EventSubmitResult&) { FAIL(); });
}

}  // namespace
}  // namespace corvane::test
