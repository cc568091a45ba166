#include <corvane/Snapshot/Snapshot.h>

#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

class Snapshots : public TrackingTest {
  protected:
    std::shared_ptr<Tracker> child = root->chain("child");
};

TEST_F(Snapshots, SayWhetherAnEventWouldBeComplete) {
    using Missing = SnapshotEvent::MissingData;
    const auto noViewer = Missing::optional("viewer", DataType::of<Viewer>());
    auto event = child->snapshot(SnapshotPolicy::now)->evaluate<ScreenView>();
    EXPECT_FALSE(event.isValid);
    EXPECT_EQ(event.missingData, (std::vector<Missing>{Missing::required("screen", DataType::of<Screen>()), noViewer}));
    root->push(Screen{"home"});
    event = child->snapshot(SnapshotPolicy::all)->evaluate<ScreenView>();
    EXPECT_TRUE(event.isValid);
    EXPECT_EQ(event.missingData, (std::vector<Missing>{noViewer}));
    EXPECT_TRUE(std::string(event.entries.at(0).dataEntry.file).ends_with("SnapshotTest.cpp"));
    EXPECT_FALSE(child->snapshot(SnapshotPolicy::now)->evaluate<Identified>().isValid) << "no event has been made";
}

TEST_F(Snapshots, AnswerWithTheNewestOrTheOldestEntryOfTheNearestTracker) {
    const auto answer = [](const SnapshotType& snapshot) {
        return snapshot.evaluate<ScreenView>().entries.at(0).dataEntry.data.toDict()["name"].string();
    };
    root->push(Screen{"root"});
    child->push(Screen{"old"});
    child->push(Screen{"new"}, {DataEventTrait::onlyOnce});
    const auto current = child->snapshot(SnapshotPolicy::now);
    EXPECT_EQ(answer(*child->snapshot(SnapshotPolicy::all)), "old");
    EXPECT_EQ(answer(*current), "new");
    const auto& levels = static_cast<const Snapshot&>(*current).levels();
    ASSERT_EQ(levels.size(), 2u);
    EXPECT_EQ(levels[0].name + " " + levels[1].name, "child root");
    EXPECT_TRUE(levels[1].entries.empty()) << "a nearer tracker has the key";
    EXPECT_EQ(submit<ScreenView>(child), R"({"screen":{"name":"new"}})") << "a snapshot consumes nothing";
}

TEST_F(Snapshots, AreCopiesThatOutliveTheirTracker) {
    child->explicitTime<Played>(now() - 2s);
    const auto snapshot = child->snapshot(SnapshotPolicy::now);
    child.reset();
    sessions.reset();
    root.reset();
    const auto event = snapshot->evaluate<Played>();
    ASSERT_TRUE(event.isValid);
    EXPECT_GE(event.entries[0].dataEntry.data.as<TimedData>()->duration, 2000);
}

}  // namespace
}  // namespace corvane::test
