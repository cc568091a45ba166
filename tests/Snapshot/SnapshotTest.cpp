#include <corvane/Snapshot/Snapshot.h>

#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

using namespace std::chrono_literals;

class Snapshots : public TrackingTest {
  protected:
    /// The texts of the entries that answer an event's properties.
    static std::vector<std::string> answers(const SnapshotEvent& event) {
        std::vector<std::string> texts;
        for (const auto& entry : event.entries)
            texts.push_back(entry.name + "=" + entry.dataEntry.data.toDict().text());
        return texts;
    }

    std::shared_ptr<Tracker> child = root->chain("child");
};

TEST_F(Snapshots, SayWhetherAnEventWouldBeComplete) {
    using Missing = SnapshotEvent::MissingData;
    auto event = child->snapshot(SnapshotPolicy::now)->evaluate<ScreenView>();
    EXPECT_FALSE(event.isValid);
    EXPECT_EQ(event.missingData, (std::vector<Missing>{Missing::required("screen", DataType::of<Screen>()),
                                                       Missing::optional("viewer", DataType::of<Viewer>())}));
    EXPECT_TRUE(event.entries.empty());

    root->push(Screen{"home"});
    event = child->snapshot(SnapshotPolicy::all)->evaluate<ScreenView>();
    EXPECT_TRUE(event.isValid);
    EXPECT_EQ(event.missingData, (std::vector<Missing>{Missing::optional("viewer", DataType::of<Viewer>())}));
    EXPECT_EQ(answers(event), (std::vector<std::string>{R"(screen={"name":"home"})"}));
    EXPECT_TRUE(std::string(event.entries[0].dataEntry.file).ends_with("SnapshotTest.cpp"));
    EXPECT_FALSE(child->snapshot(SnapshotPolicy::now)->evaluate<Identified>().isValid) << "no event has been made";
}

TEST_F(Snapshots, AnswerWithTheNewestOrTheOldestEntryOfTheNearestTracker) {
    root->push(Screen{"root"});
    child->push(Screen{"old"});
    child->push(Screen{"new"}, {DataEventTrait::onlyOnce});
    const auto current = child->snapshot(SnapshotPolicy::now);
    const auto everything = child->snapshot(SnapshotPolicy::all);
    EXPECT_EQ(answers(everything->evaluate<ScreenView>())[0], R"(screen={"name":"old"})");
    for (int i = 0; i < 2; ++i) {
        EXPECT_EQ(answers(current->evaluate<ScreenView>())[0], R"(screen={"name":"new"})");
    }
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
    EXPECT_EQ(event.entries[0].dataEntry.key, "span");
    EXPECT_EQ(std::string(event.entries[0].dataEntry.file), "corvane/Snapshot/Snapshot.cpp");
}

TEST_F(Snapshots, OnTheQueueAreAProgrammingError) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_DEATH(
        {
            root->transaction([&](AccessTracker&) { (void)root->snapshot(SnapshotPolicy::now); });
            processor->drain();
        },
        "Tracker::snapshot must not be called on queue com.veskar.corvane.event-tracker");
}

}  // namespace
}  // namespace corvane::test
