#include <corvane/Models/EventData.h>
#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/PrivateFile.h>
#include <corvane/Platform/RecordingSwitch.h>
#include <corvane/Store/DeferredStoreCore.h>

#include "tests/support/TrackingFixture.h"

#include <sys/resource.h>

#include <future>

namespace corvane::test {
namespace {

/// Whether to record, as the file of a documents directory and a session manager have it.
class Recording : public ::testing::Test {
  protected:
    TemporaryDocuments documents;
    CapturedLog log;
    std::shared_ptr<RecordingProcessor> processor = std::make_shared<RecordingProcessor>();
    SessionManager sessions;
    std::shared_ptr<Tracker> root = sessions.tracker();
    const std::filesystem::path file = documents / "com.veskar.corvane.recording";

    Recording() {
        sessions.processorManager()->add(processor);
        sessions.start(Session::Kind::userEvents());
        processor->settle();
    }

    ~Recording() override {
        DeferredStoreCore::queue().sync([] {});
    }  // choices that nobody waited for

    /// Waits until the choice is on disk; returns why it is not.
    std::string choose(bool isOn) {
        std::promise<std::string> told;
        sessions.setRecording(isOn, [&](const AnyError* error) { told.set_value(error ? error->what() : ""); });
        EXPECT_EQ(sessions.isRecording(), isOn) << "at once";
        return told.get_future().get();
    }
    template <class E>
    std::string submit() {
        std::string outcome = "(no completion)";
        root->submit<E>([&](const EventSubmitResult& result) {
            const auto* error = result.succeeded() ? nullptr : result.error()->as<TrackerError>();
            outcome = error ? error->what() : "recorded";
            EXPECT_TRUE(!error || error->value() == TrackerError::notRecording);
        });
        processor->settle();
        return outcome;
    }
};

TEST_F(Recording, OffRefusesEventsConsumesNothingAndIsRemembered) {
    EXPECT_TRUE(sessions.isRecording()) << "until somebody says otherwise";
    EXPECT_FALSE(std::filesystem::exists(file));
    root->push(Screen{"home"}, {DataEventTrait::onlyOnce});
    root->time<Played>();
    EXPECT_EQ(choose(false), "");
    EXPECT_EQ(submit<ScreenView>(), "recording is off");
    EXPECT_EQ(submit<Played>(), "recording is off");
    sessions.end();
    sessions.start(Session::Kind::userEvents());
    EXPECT_EQ(submit<Identified>(), "recording is off") << "whatever becomes of sessions";

    DocumentsDirectory::set(documents.path());  // as a later run finds it
    EXPECT_FALSE(sessions.isRecording());
    EXPECT_EQ(choose(true), "");
    EXPECT_EQ(submit<ScreenView>(), "recorded") << "with the data of before";
    EXPECT_EQ(submit<Played>(), "recorded") << "with the timer of before";
    EXPECT_EQ(processor->events().size(), 2u);

    // It must be on when an event is submitted, and when it is processed.
    for (const bool first : {false, true}) {
        root->suspend();
        sessions.setRecording(first);
        std::string outcome;
        root->submit<Identified>([&](const EventSubmitResult& result) { outcome = result.error()->what(); });
        sessions.setRecording(!first);
        root->resume();
        processor->settle();
        EXPECT_EQ(outcome, "recording is off") << first;
    }
}

TEST_F(Recording, AnotherProcesssWordCountsAndOneThatCannotBeReadIsNo) {
    const auto next = [&](const std::string& contents) {
        replacePrivateFile(file, contents);
        sessions.end();
        sessions.start(Session::Kind::userEvents());
        processor->settle();
        return submit<Identified>();
    };
    EXPECT_EQ(next("off\n"), "recording is off");
    EXPECT_EQ(next("on 7 7 and what a later version has to say\n"), "recorded");
    // A session that goes on hears of it, too, and no lack of descriptors is for good.
    replacePrivateFile(file, "off 7 7\n");
    RecordingSwitch::look();
    EXPECT_EQ(submit<Identified>(), "recording is off");
    replacePrivateFile(file, "on 7 7\n");
    EXPECT_EQ(submit<Identified>(), "recording is off") << "it is looked at behind the one that is refused";
    EXPECT_EQ(submit<Identified>(), "recorded");
    replacePrivateFile(file, "on 7 7 again\n");
    rlimit limit{};
    getrlimit(RLIMIT_NOFILE, &limit);
    const rlimit no{0, limit.rlim_max};
    setrlimit(RLIMIT_NOFILE, &no);
    RecordingSwitch::look();
    setrlimit(RLIMIT_NOFILE, &limit);
    EXPECT_EQ(log.count("Nothing is recorded"), 1);
    EXPECT_EQ(submit<Identified>(), "recording is off");
    EXPECT_EQ(submit<Identified>(), "recorded");
    EXPECT_EQ(next(""), "recording is off");
    EXPECT_EQ(log.count("Nothing is recorded: whether to record is not known"), 2);
    std::filesystem::remove(file);
    std::filesystem::create_directory(file);
    EXPECT_EQ(submit<Identified>(), "recording is off");
    EXPECT_NE(choose(true), "") << "there is no room for the file";
    EXPECT_EQ(log.count("Failed to keep whether to record"), 1);
    EXPECT_EQ(submit<Identified>(), "recorded") << "this process was told";
    std::filesystem::remove(file);
    replacePrivateFile(file, "off 6 6\n");
    EXPECT_EQ(submit<Identified>(), "recorded") << "until it is saved";
    EXPECT_EQ(RecordingSwitch::epoch(), 7) << "what was to be forgotten still is";
    replacePrivateFile(file, "off 9 7\n");
    RecordingSwitch::look();
    EXPECT_EQ(RecordingSwitch::epoch(), 9) << "whatever is not saved";
    EXPECT_EQ(choose(true), "");
    EXPECT_EQ(readWholeFile(file), "on 9 7\n");
}

}  // namespace
}  // namespace corvane::test
