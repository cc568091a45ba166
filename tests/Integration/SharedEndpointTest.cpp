#include "tests/Integration/FaultFixture.h"

namespace corvane::test {
namespace {

TEST(SharedEndpoint, TwoProcessorsOfOneProcessLoseNothingAndAreToldOf) {
    FaultFixture disk;
    constexpr const char* shared = "Endpoint is used by two processors of this process";
    Application(disk.server.url()).abandon();
    {
        Application first(disk.server.url());
        EXPECT_EQ(disk.log.count(shared), 0);
        first.submit(3);
        first.wait();
        Application second(disk.server.url());
        EXPECT_TRUE(
            disk.log.has(LogLevel::error, std::string(shared) + ", and its events may be sent twice, name=main"));
        EXPECT_EQ(second.wait().delivered.documents, 1) << "the first one's open batch";
        first.submit(2);
        first.wait();
        second.submit(4);
        first.abandon();
        second.abandon();
    }
    disk.runAgain();
    EXPECT_EQ(disk.distinctEvents(), 9u);
    EXPECT_EQ(eventIDs(disk.server.documents()).size(), 12u) << "the three that went out of the open batch came twice";
    EXPECT_TRUE(FaultFixture::rows().empty());
    EXPECT_TRUE(disk.payloads().empty());
}

TEST(SharedEndpoint, ADocumentThatTwoProcessorsSendIsFinishedOnce) {
    for (const bool firstIsRefused : {false, true}) {
        SCOPED_TRACE(firstIsRefused);
        FaultFixture disk;
        disk.server.script(ScriptedServer::Reply::status(firstIsRefused ? 503 : 200).hold());
        {
            Application first(disk.server.url(), 1);
            std::promise<void> handedOver;
            first.sessions.tracker()->submit<ScreenView>([&](const EventSubmitResult&) { handedOver.set_value(); });
            handedOver.get_future().wait();
            ASSERT_TRUE(disk.server.waitForRequests(1));
            Application second(disk.server.url(), 1);
            EXPECT_EQ(second.wait().delivered.documents, 1);
            disk.server.release();
            const auto report = first.wait();
            EXPECT_EQ(report.delivered.documents, firstIsRefused ? 0 : 1);
            EXPECT_EQ(report.givenUp.documents, firstIsRefused ? 1 : 0)
                << "its row has gone: there is nothing to retry";
            first.abandon();
            second.abandon();
        }
        const auto documents = disk.server.documents();
        ASSERT_EQ(documents.size(), 2u);
        EXPECT_EQ(documents[0]["metadata"]["identifier"].string(), documents[1]["metadata"]["identifier"].string());
        EXPECT_TRUE(FaultFixture::rows().empty());
        EXPECT_TRUE(disk.payloads().empty());
    }
}

}  // namespace
}  // namespace corvane::test
