#include <corvane/Testing/FakeTransferSession.h>
#include <corvane/Testing/ManualClock.h>
#include <corvane/Testing/ManualQueue.h>
#include <corvane/Testing/Matchers.h>
#include <corvane/Testing/ProcessSettings.h>
#include <corvane/corvane.h>

#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

using namespace ::testing;

class Recording : public TrackingTest {};

TEST_F(Recording, SaysWhatIsThereAndWhatWasExpected) {
    root->submit<Played>();
    EXPECT_EQ(processor->checkNames({}), "") << "what failed was not recorded";
    root->push(test::Screen{"home"});
    root->push(Viewer{"7", "gold"});
    root->submit<ScreenView>();
    root->push(test::Screen{"list"});
    root->submit<ScreenView>();
    EXPECT_EQ(processor->checkNames({"ScreenView", "ScreenView"}), "");
    EXPECT_EQ(processor->checkCount(2, "ScreenView", {{"viewer.plan", "gold"}}), "");
    EXPECT_EQ(processor->checkOnly("ScreenView", {{"screen", test::Screen{"list"}}, {"viewer.id", "7"}}), "");
    const std::string recorded = R"(
  ScreenView {"screen":{"name":"home"},"viewer":{"id":"7","plan":"gold"}}
  ScreenView {"screen":{"name":"list"},"viewer":{"id":"7","plan":"gold"}})";
    EXPECT_EQ(processor->checkOnly("ScreenView", {{"screen.name", "home"}, {"viewer.id", 7}}),
              "expected 1 of ScreenView, screen.name = \"home\", viewer.id = 7, and there are 0; recorded:" + recorded);
    EXPECT_EQ(processor->checkNames({"Played"}), "expected Played; recorded:" + recorded);
    EXPECT_THROW((void)processor->only("ScreenView"), std::runtime_error);
    EXPECT_THROW((void)processor->events("ScreenView").at(0).at("screen.nme"), std::out_of_range);
    EXPECT_THAT(processor->events(), ElementsAre(IsEvent("ScreenView", HasField("screen.name", "home")),
                                                 IsEvent("ScreenView", HasText("screen.name", StartsWith("li")),
                                                         Not(HasInteger("viewer.id", Ge(7))))));
    processor->clear();
    EXPECT_EQ(processor->checkOnly("ScreenView"), "expected 1 of ScreenView, and there are 0; nothing was recorded");
}

TEST_F(Recording, TimePassesWhenTheTestSaysSo) {
    using namespace std::chrono_literals;
    const TemporaryDocuments documents;
    std::shared_ptr<FakeTransferSession> transfers;
    ProcessSettings settings;
    settings.setTransfers(FakeTransferSession::factory(transfers));
    const auto uploads = std::make_shared<UploadBatchEventProcessor>(Client{"com.example", "Example", "1", 1},
                                                                     Endpoint{"http://127.0.0.1:9/", "test"},
                                                                     UploadBatchEventConfig({.maximumDelay = 24h}));
    ManualQueue queue;
    int told = 0;
    uploads->setDeliveryObserver([&](const DeliveryUpdate&) { ++told; });
    sessions->processorManager()->add(uploads);

    ManualClock clock(*dateFromMilliseconds(1'000'000));
    root->time<Played>();
    clock.advance(90s, *processor);
    root->submit<Played>();
    EXPECT_EQ(processor->checkOnly(
                  "Played",
                  {{"span.startTimestamp", 1'000'000}, {"span.endTimestamp", 1'090'000}, {"span.duration", 90'000}}),
              "");
    clock.advance(23h, *processor);
    EXPECT_TRUE(!transfers || transfers->made().empty());
    clock.advance(1h, *processor);
    ASSERT_TRUE(transfers->waitForTasks(1));
    transfers->complete(1, 200);
    EXPECT_TRUE(uploads->waitForDelivery(std::chrono::steady_clock::now() + 10s).pending.documents == 0);
    EXPECT_EQ(told, 0);
    const auto ran = queue.run();
    EXPECT_GT(ran, 0u);
    EXPECT_EQ(static_cast<std::size_t>(told), ran);
    clock.set(*dateFromMilliseconds(-5));
    EXPECT_EQ(millisecondsSince1970(now()), -5);
}

TEST(FieldValue, FollowsPathsAndComparesNumbersAsNumbers) {
    const JSON json(R"({"list":[{"a":1},{"a":2.0}],"flag":true,"none":null,"text":"\u0041"})");
    EXPECT_TRUE(FieldValue(2).equals(valueAt(json, "list.1.a")));
    EXPECT_TRUE(FieldValue(1.0).equals(valueAt(json, "list.0.a")));
    EXPECT_TRUE(FieldValue(true).equals(valueAt(json, "flag")));
    EXPECT_TRUE(FieldValue(nullptr).equals(valueAt(json, "none")));
    EXPECT_TRUE(FieldValue("A").equals(valueAt(json, "text")));
    EXPECT_FALSE(FieldValue(1).equals(valueAt(json, "flag")));
    for (const char* path : {"", ".", "list.2", "list.-1", "list.1x", "list.0.a.b", "list..a", "nothing"}) {
        EXPECT_FALSE(valueAt(json, path).exists()) << path;
        EXPECT_FALSE(FieldValue(nullptr).equals(valueAt(json, path))) << path;
    }
}

TEST(FakeTransfers, EndAsTheyWereScripted) {
    const TemporaryDocuments documents;
    const CapturedLog log;
    std::shared_ptr<FakeTransferSession> transfers;
    ProcessSettings settings;
    using Outcome = FakeTransferSession::Outcome;
    settings.setTransfers(FakeTransferSession::factory(
        transfers, {Outcome::failure(TransferError::Code::blocked), Outcome::status(404)}));
    SessionManager sessions;
    const auto uploads = std::make_shared<UploadBatchEventProcessor>(Client{"com.example.test", "Test", "1", 1},
                                                                     Endpoint{"https://example.com/in", "main"});
    sessions.processorManager()->add(uploads);
    sessions.tracker()->push(test::Screen{"home"});
    for (std::size_t document = 1; document <= 3; ++document) {
        sessions.start(Session::Kind::userEvents());
        sessions.tracker()->submit<ScreenView>();
        sessions.endSync();
        ASSERT_TRUE(transfers->waitForTasks(document));
    }
    EXPECT_EQ(transfers->task(1)->request.url, "https://example.com/in");
    transfers->complete(3, 200);
    const auto report = uploads->waitForDelivery(std::chrono::steady_clock::now() + 10s);
    EXPECT_EQ(report.delivered.documents, 1u);
    EXPECT_EQ(report.givenUp.documents, 1u);
    EXPECT_EQ(report.pending.documents, 1u);

    transfers->scriptCancel(std::nullopt);
    const auto task = transfers->uploadTask({}, "none");
    task->cancel();
    EXPECT_TRUE(transfers->task(4)->wasCancelled() && task->state() == TransferTask::State::cancelling);
}

}  // namespace
}  // namespace corvane::test
