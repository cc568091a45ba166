#include "tests/Bridge/BridgeFixture.h"
#include "tests/support/Documents.h"

#include <corvane/Platform/MainQueue.h>

#include <atomic>
#include <future>

namespace corvane::test {
namespace {

class BridgeProcessors : public BridgeTest {};

class Complete final : public CVEventProcessorType {
  public:
    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {
        if (refuses) throw std::runtime_error("not in this process");
    }
    void processEvent(const CVProcessEvent& event) override {
        calls.push_back(event.name() + " " + event.version() + " " + event.json().text() + " " + *event.groupName());
        throw std::runtime_error("broken");
    }
    void didEnterGroup(const CVGroup& group) override { calls.push_back("enter " + group.name); }
    void didLeaveGroup(const CVGroup& group) override { calls.push_back("leave " + group.name); }
    void didStartSession(const CVSession&) override { calls.push_back("start"); }
    void didUpdateSession(const CVSession&, bool submits) override { calls.push_back(submits ? "submit" : "update"); }
    void didEndSession(const CVSession& session, Date endDate) override {
        calls.push_back(endDate >= session.startDate() ? "end" : "end before start");
    }
    bool resumeBackgroundProcessingForIdentifier(const std::string& identifier, const std::function<void()>&) override {
        calls.push_back("resume " + identifier);  // and never calls the completion
        return true;
    }
    std::vector<std::string> calls;
    bool refuses = true;
};

TEST_F(BridgeProcessors, HearEverythingUntilTheyAreRemovedAndStopNobodyElse) {
    CapturedLog log;
    const auto complete = std::make_shared<Complete>();
    const auto manager = sessions->processorManager();
    CVError error;
    EXPECT_FALSE(manager->addEventProcessor(complete, &error));
    EXPECT_EQ(describe(error), "Corvane.HostError 0: not in this process");
    complete->refuses = false;
    EXPECT_TRUE(manager->addEventProcessor(complete));
    manager->resumeBackgroundProcessingForIdentifier("id", [] { FAIL(); });
    root->enterGroupWithName("g");
    root->submitRawEvent({"View", {}});
    root->leaveGroup();
    sessions->pushSessionData({"k", raw("Data", {})}, {}, true);
    sessions->endSession();
    manager->addEventProcessor(complete);
    manager->removeEventProcessor(complete);
    sessions->startSessionForKind(CVSessionKind::userEvents);
    processor->settle();
    EXPECT_EQ(complete->calls, (std::vector<std::string>{"start", "resume id", "enter g", "View 0.1.0 {} g", "leave g",
                                                         "submit", "end"}));
    EXPECT_EQ(processor->events().size(), 1u);
}

TEST_F(BridgeProcessors, LogInEveryFormat) {
    using Format = CVLoggingEventProcessorFormat;
    CapturedLog log;
    const auto manager = sessions->processorManager();
    manager->addEventProcessor(std::make_shared<CVLoggingEventProcessor>(Format::json));
    manager->addEventProcessor(std::make_shared<CVLoggingEventProcessor>());
    manager->addEventProcessor(std::make_shared<CVLoggingEventProcessor>(
        Format::custom, [](const CVProcessEvent& event) { return "custom " + event.name(); }));
    root->pushDataEvent(raw("Screen", {{"name", "home"}}));
    submit(root, CVRawEvent{"View", {{"screen", {"Screen", required}}}});
    for (const char* line :
         {R"(View -> {"screen":{"name":"home"}})", R"(View -> ["screen": ["name": "home"]])", "custom View"}) {
        EXPECT_TRUE(log.has(LogLevel::debug, line)) << line;
    }
    EXPECT_EQ(log.count("Started session"), 3) << "as it was running when they were added";
}

TEST_F(BridgeProcessors, AreSampledAndFilteredAndWhatWaitsIsCounted) {
    const auto wrapped = std::make_shared<Complete>();
    wrapped->refuses = false;
    const auto filter = std::make_shared<CVFilteringEventProcessor>(
        std::make_shared<CVSamplingEventProcessor>(wrapped, 1), [](const CVProcessEvent& event) {
            if (event.name() == "Secret") return std::optional<CVProcessEvent>();
            return std::optional(CVProcessEvent({"Seen", event.json(), "g"}));
        });
    EXPECT_THROW(CVSamplingEventProcessor(nullptr, 1), BridgeError);
    EXPECT_THROW(CVFilteringEventProcessor(wrapped, {}), BridgeError);
    CapturedLog log;
    sessions->processorManager()->addEventProcessor(filter);
    processor->settle();
    root->suspend();
    root->submitRawEvent({"Secret", {}});
    root->submitRawEvent({"View", {}});
    EXPECT_EQ(sessions->waitingCount(), 2u);
    root->resume();
    sessions->endSession();
    sessions->processorManager()->removeEventProcessor(filter);
    sessions->startSessionForKind(CVSessionKind::userEvents);
    processor->settle();
    EXPECT_EQ(sessions->waitingCount(), 0u);
    EXPECT_EQ(wrapped->calls, (std::vector<std::string>{"start", "Seen 0.1.0 {} g", "end"}));
    EXPECT_EQ(filter->proxyEventProcessor()->droppedEvents(), 1u);
    EXPECT_EQ(filter->proxyEventProcessor()->failures(), 0u) << "what the processor throws is not the filter's";
}

TEST_F(BridgeProcessors, UploadBatchesThroughTheBridge) {
    TemporaryDocuments documents;
    ScriptedServer server;
    const auto uploads = std::make_shared<CVUploadBatchEventProcessor>(
        CVClient("com.example.plugin", "Plugin", "1.0", 1), CVEndpoint(server.url("/events"), "main"),
        CVUploadBatchEventConfig(2, false));
    ASSERT_TRUE(sessions->processorManager()->addEventProcessor(uploads));
    CVError error;
    EXPECT_FALSE(CVSessionManager().processorManager()->addEventProcessor(uploads, &error));
    EXPECT_EQ(error.domain(), "Corvane.InvalidArgument") << "its batches are the first manager's";
    sessions->pushSessionData({"device", raw("Device", {{"model", "M1"}})});
    root->pushDataEvent(raw("Screen", {{"name", "home"}}));
    std::atomic<int> delivered = 0;
    uploads->setDeliveryObserver([&](const CVDeliveryUpdate& update) {
        if (update.step == CVDeliveryUpdate::Step::delivered) ++delivered;
    });
    for (int i = 0; i < 3; ++i) root->submitRawEvent({"View", {{"screen", {"Screen", required}}}});
    uploads->flush();
    const auto report = uploads->waitForDelivery(std::chrono::steady_clock::now() + 20s, {.onlyWhileReachable = true});
    EXPECT_EQ(report.delivered, (CVDeliveryReport::Count{3, 2}));
    std::promise<void> heard;
    MainQueue::async([&] { heard.set_value(); });
    heard.get_future().wait();
    EXPECT_EQ(delivered, 2) << "before what is put on the main queue behind the wait";
    uploads->setDeliveryObserver({});
    sessions->endSession();
    const auto received = server.documents();
    ASSERT_EQ(received.size(), 2u);
    for (const auto& document : received) {
        EXPECT_EQ(document["data"]["session"]["device"]["model"].string(), "M1");
        EXPECT_EQ(document["data"]["events"][0].text(),
                  R"({"data":{"screen":{"name":"home"}},"metadata":{"name":"View","version":"0.1.0"}})");
    }
    EXPECT_FALSE(uploads->resumeBackgroundProcessingForIdentifier("not mine", [] {}));

    std::promise<CVLedger> read;
    uploads->readLedger([&](const CVLedger& ledger) { read.set_value(ledger); });
    EXPECT_EQ(read.get_future().get(), uploads->ledger());
    EXPECT_EQ(uploads->ledger().accepted(), (CVLedger::Count{3, 2}));

    server.script(ScriptedServer::Reply::status(503));
    sessions->startSessionForKind(CVSessionKind::userEvents);
    for (int i = 0; i < 3; ++i) root->submitRawEvent({"View", {}});
    std::promise<CVForgottenRecords> dropped;
    sessions->forget([&](const CVForgottenRecords& forgotten, const CVError* left) {
        EXPECT_EQ(left, nullptr);
        dropped.set_value(forgotten);
    });
    EXPECT_EQ(dropped.get_future().get(), (CVForgottenRecords{3, 1}));

    std::promise<bool> isKept;
    sessions->setRecording(false, [&](const CVError* kept) { isKept.set_value(!kept); });
    EXPECT_TRUE(isKept.get_future().get());
    EXPECT_FALSE(sessions->isRecording());
}

}  // namespace
}  // namespace corvane::test
