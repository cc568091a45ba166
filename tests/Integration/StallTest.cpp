#include "tests/Integration/FaultFixture.h"

#include <corvane/Store/DeferredStoreCore.h>

namespace corvane::test {
namespace {

class Stall : public ::testing::Test, protected FaultFixture {};

TEST_F(Stall, AStalledStoreHoldsUpNoCallOfTheHost) {
    std::promise<void> release;
    DeferredStoreCore::queue().async([&] { release.get_future().wait(); });

    std::atomic<int> completed = 0;
    Application application(server.url());  // constructs, adds, starts and pushes
    const auto tracker = application.sessions.tracker()->chain("player");
    for (int i = 0; i < 1000; ++i) {
        tracker->push(Screen{"home"}, {DataEventTrait::unique});
        tracker->submit<ScreenView>([&](const EventSubmitResult&) { ++completed; });
    }
    EXPECT_EQ(completed, 0) << "no event is acknowledged before it is on disk";

    release.set_value();
    application.sessions.endSync();
    EXPECT_EQ(completed, 1000);
    EXPECT_EQ(application.wait().delivered, (DeliveryReport::Count{1000, 20}));
}

TEST_F(Stall, AServerThatNeverAnswersHoldsUpNeitherTheHostNorTheEvents) {
    server.script(ScriptedServer::Reply::never(), 100);
    std::atomic<int> completed = 0;
    {
        Application application(server.url(), 10);
        for (int i = 0; i < 200; ++i) {
            application.sessions.tracker()->submit<ScreenView>([&](const EventSubmitResult&) { ++completed; });
        }
        application.sessions.endSync();
        EXPECT_EQ(completed, 200);
        ASSERT_TRUE(server.waitForRequests(4));
        const auto report = application.uploads->waitForDelivery(std::chrono::steady_clock::now() + 10ms);
        EXPECT_EQ(report.pending, (DeliveryReport::Count{200, 20}));
        EXPECT_EQ(server.requests().size(), 4u);
    }
    ScriptedServer healthy;
    Application application(healthy.url());
    EXPECT_EQ(application.wait().delivered.documents, 20) << "what was cancelled is still on disk";
    EXPECT_EQ(eventIDs(healthy.documents()).size(), 200u);
}

}  // namespace
}  // namespace corvane::test
