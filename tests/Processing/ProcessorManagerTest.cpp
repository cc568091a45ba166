#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

class Resuming final : public RecordingProcessor {
  public:
    explicit Resuming(bool takes) : takes_(takes) {}
    bool resumeBackgroundProcessing(const std::string& identifier, const std::function<void()>& completion) override {
        calls.push_back("resume " + identifier);
        if (takes_) completion();
        return takes_;
    }

  private:
    bool takes_;
};

class Throwing final : public EventProcessorType {
  public:
    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {}
    void process(const ProcessEvent&) override { throw std::runtime_error("host bug"); }
};

class ProcessorManagerTest : public TrackingTest {
  protected:
    struct Mark {};
    std::shared_ptr<ProcessorManager> manager = sessions->processorManager();
};

TEST_F(ProcessorManagerTest, CallsProcessorsInOrderAsOftenAsTheyWereAdded) {
    manager->add(std::make_shared<Throwing>());
    auto late = std::make_shared<RecordingProcessor>();
    manager->add(late);
    manager->add(late);
    root->submit<Mark>();
    manager->remove(late);
    manager->remove(late);
    root->submit<Mark>();
    processor->drain();
    EXPECT_EQ(late->calls, (std::vector<std::string>{"start", "start", "process Mark", "process Mark"}))
        << "added in a session, it learns of it; another one's exception stops at the call";
    EXPECT_EQ(processor->events.size(), 2u);
    EXPECT_THROW(manager->add(nullptr), InvalidArgument);
}

TEST_F(ProcessorManagerTest, KeepsOneResumeRequestForThePocessorThatTakesIt) {
    CapturedLog log;
    int replaced = 0, taken = 0;
    manager->resumeBackgroundProcessing("first", [&] { ++replaced; });
    manager->resumeBackgroundProcessing("second", [&] { ++taken; });
    auto declines = std::make_shared<Resuming>(false);
    auto takes = std::make_shared<Resuming>(true);
    auto after = std::make_shared<Resuming>(true);
    manager->add(declines);
    manager->add(takes);
    manager->add(after);
    processor->drain();
    EXPECT_EQ(declines->calls.back(), "resume second");
    EXPECT_EQ(takes->calls.back(), "resume second");
    EXPECT_EQ(after->calls.back(), "start") << "what was taken is not offered again";
    EXPECT_EQ(taken, 1);
    EXPECT_EQ(replaced, 0);
    EXPECT_TRUE(log.has(LogLevel::default_,
                        "No event processors handled background resuming for identifier=first. Deferring background "
                        "resuming"));

    manager->resumeBackgroundProcessing("third", [&] { ++taken; });
    processor->drain();
    EXPECT_EQ(taken, 3) << "every processor is asked, also after one has taken it";
    EXPECT_TRUE(log.has(LogLevel::default_, "Event processor handled background resuming for identifier=third"));
}

}  // namespace
}  // namespace corvane::test
