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

}  // namespace
}  // namespace corvane::test
