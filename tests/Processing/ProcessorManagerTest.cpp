#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

struct Resuming final : RecordingProcessor {
    explicit Resuming(bool doesTake) : takes(doesTake) {}
    bool resumeBackgroundProcessing(const std::string& identifier, const std::function<void()>& completion) override {
        asked = identifier;
        if (takes) completion();
        return takes;
    }
    const bool takes;
    std::string asked;
};

class ProcessorManagerTest : public TrackingTest {
  protected:
    struct Mark {};
    std::shared_ptr<ProcessorManager> manager = sessions->processorManager();
};

TEST_F(ProcessorManagerTest, CallsProcessorsAsOftenAsTheyWereAddedUntilTheyAreRemoved) {
    auto late = std::make_shared<RecordingProcessor>();
    manager->add(late);
    manager->add(late);
    root->submit<Mark>();
    manager->remove(late);
    root->submit<Mark>();
    processor->settle();
    EXPECT_EQ(late->history(), (std::vector<std::string>{"start", "start", "process Mark", "process Mark"}))
        << "added in a session, it learns of it";
    EXPECT_THROW(manager->add(nullptr), InvalidArgument);
}

TEST_F(ProcessorManagerTest, KeepsOneResumeRequestForThePocessorThatTakesIt) {
    int replaced = 0, taken = 0;
    manager->resumeBackgroundProcessing("first", [&] { ++replaced; });
    manager->resumeBackgroundProcessing("second", [&] { ++taken; });
    auto declines = std::make_shared<Resuming>(false);
    auto takes = std::make_shared<Resuming>(true);
    auto after = std::make_shared<Resuming>(true);
    manager->add(declines);
    manager->add(takes);
    manager->add(after);
    processor->settle();
    EXPECT_EQ(declines->asked, "second");
    EXPECT_EQ(takes->asked, "second");
    EXPECT_EQ(after->asked, "") << "what was taken is not offered again";
    EXPECT_EQ(taken, 1);
    EXPECT_EQ(replaced, 0);

    manager->resumeBackgroundProcessing("third", [&] { ++taken; });
    processor->settle();
    EXPECT_EQ(taken, 3) << "every processor is asked, also after one has taken it";
}

}  // namespace
}  // namespace corvane::test
