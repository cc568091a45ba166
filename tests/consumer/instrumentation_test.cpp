// A host's test of its own instrumentation, with the installed package and GoogleTest.
#include <corvane/Testing/Matchers.h>
#include <corvane/Testing/Testing.h>
#include <corvane/corvane.h>

#include <gmock/gmock.h>

namespace {

using namespace corvane;
using namespace corvane::test;
using ::testing::ElementsAre;
using ::testing::StartsWith;

struct Screen {
    std::string name;
    int depth = 0;
};
struct ScreenView {
    EventProperty<Screen> screen = required;
};

TEST(Instrumentation, RecordsAndUploadsWhatTheShopDoes) {
    const TemporaryDocuments documents;
    const CapturedLog log;
    ScriptedServer collector;
    ProcessSettings settings;
    settings.setTransfers(InProcessTransferSession::factory());
    const auto recording = std::make_shared<RecordingProcessor>();
    SessionManager sessions;
    sessions.processorManager()->add(recording);
    sessions.processorManager()->add(std::make_shared<UploadBatchEventProcessor>(
        Client{"com.example.consumer", "Consumer", "1.0", 1}, Endpoint{collector.url(), "main"}));
    sessions.start(Session::Kind::userEvents());
    sessions.tracker()->push(Screen{"home", 2});
    sessions.tracker()->submit<ScreenView>();
    EXPECT_EQ(recording->checkOnly("ScreenView", {{"screen.name", "home"}, {"screen.depth", 2}}), "");
    EXPECT_THAT(recording->events(), ElementsAre(IsEvent("ScreenView", HasText("screen.name", StartsWith("ho")))));
    sessions.endSync();
    ASSERT_TRUE(collector.waitForRequests(1));
    EXPECT_EQ(collector.documents().at(0)["data"]["events"][0]["metadata"]["name"].string(), "ScreenView");
    EXPECT_EQ(log.count("Failed"), 0);
}

}  // namespace
