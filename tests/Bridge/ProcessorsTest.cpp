#include "tests/Bridge/BridgeFixture.h"
#include "tests/support/CapturedLog.h"
#include "tests/support/Documents.h"
#include "tests/support/ScriptedServer.h"
#include "tests/support/TemporaryDocuments.h"

#include <chrono>
#include <stdexcept>

namespace corvane::test {
namespace {

class BridgeProcessors : public BridgeTest {};

/// Implements what it must and nothing else.
class Minimal : public CVEventProcessorType {
  public:
    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {}
    void processEvent(const CVProcessEvent& event) override {
        calls.push_back(event.name() + " " + event.version() + " " + event.json().text() + " " +
                        event.groupName().value_or("-"));
    }
    std::vector<std::string> calls;
};

class Complete final : public Minimal {
  public:
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
};

class Throwing final : public CVEventProcessorType {
  public:
    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {
        if (refuses) throw std::runtime_error("not in this process");
    }
    void processEvent(const CVProcessEvent&) override { throw std::runtime_error("broken"); }
    bool refuses = true;
};

TEST_F(BridgeProcessors, HearWhatTheyImplement) {
    CapturedLog log;
    const auto minimal = std::make_shared<Minimal>();
    const auto complete = std::make_shared<Complete>();
    const auto throwing = std::make_shared<Throwing>();
    const auto manager = sessions->processorManager();
    CVError error;
    EXPECT_FALSE(manager->addEventProcessor(throwing, &error));
    EXPECT_EQ(describe(error), "Corvane.HostError 0: not in this process");
    throwing->refuses = false;
    EXPECT_TRUE(manager->addEventProcessor(throwing));
    EXPECT_TRUE(manager->addEventProcessor(minimal));
    EXPECT_TRUE(manager->addEventProcessor(complete));
    manager->resumeBackgroundProcessingForIdentifier("id", [] { FAIL(); });
    root->enterGroupWithName("g");
    root->submitRawEvent({"View", {}});
    root->leaveGroup();
    sessions->pushSessionData({"k", raw("Data", {})}, {}, true);
    sessions->endSession();
    processor->drain();
    EXPECT_EQ(minimal->calls, (std::vector<std::string>{"View 0.1.0 {} g"}));
    EXPECT_EQ(complete->calls, (std::vector<std::string>{"start", "resume id", "enter g", "View 0.1.0 {} g", "leave g",
                                                         "submit", "end"}));

    manager->addEventProcessor(complete);
    manager->removeEventProcessor(complete);
    manager->removeEventProcessor(minimal);
    complete->calls.clear();
    sessions->startSessionForKind(CVSessionKind::userEvents);
    root->submitRawEvent({"View", {}});
    processor->drain();
    EXPECT_TRUE(complete->calls.empty()) << "every entry is gone";
    EXPECT_EQ(minimal->calls.size(), 1u);
    EXPECT_EQ(processor->events.size(), 2u) << "the host's failing processor stopped nobody";
}

TEST_F(BridgeProcessors, LogInEveryFormat) {
    CapturedLog log;
    const auto manager = sessions->processorManager();
    manager->addEventProcessor(std::make_shared<CVLoggingEventProcessor>(CVLoggingEventProcessorFormat::json));
    manager->addEventProcessor(std::make_shared<CVLoggingEventProcessor>());
    manager->addEventProcessor(std::make_shared<CVLoggingEventProcessor>(
        CVLoggingEventProcessorFormat::custom, [](const CVProcessEvent& event) { return "custom " + event.name(); }));
    root->pushDataEvent(raw("Screen", {{"name", "home"}}));
    submit(root, CVRawEvent{"View", {{"screen", {"Screen", required}}}});
    EXPECT_TRUE(log.has(LogLevel::debug, R"(View -> {"screen":{"name":"home"}})"));
    EXPECT_TRUE(log.has(LogLevel::debug, R"(View -> ["screen": ["name": "home"]])"));
    EXPECT_TRUE(log.has(LogLevel::debug, "custom View"));
    root->enterGroupWithName("g");
    root->leaveGroup();
    sessions->pushSessionData({"k", raw("Data", {})});
    sessions->endSession();
    processor->drain();
    EXPECT_EQ(log.count("Entering group"), 3);
    EXPECT_EQ(log.count("Leaving group"), 3);
    EXPECT_EQ(log.count("Started session"), 3) << "as it was running when they were added";
    EXPECT_EQ(log.count("Updated session"), 3);
    EXPECT_EQ(log.count("Ended session"), 3);
}

/// An endpoint that a host computes.
class ComputedEndpoint final : public CVEndpointType {
  public:
    explicit ComputedEndpoint(std::string url) : url_(std::move(url)) {}
    std::string url() const override { return url_; }
    std::string name() const override { return "computed"; }
    std::optional<std::string> sharedContainerIdentifier() const override { return std::nullopt; }

  private:
    std::string url_;
};

TEST_F(BridgeProcessors, UploadBatchesThroughTheBridge) {
    CapturedLog log;
    TemporaryDocuments documents;
    ScriptedServer server;
    const auto uploads = std::make_shared<CVUploadBatchEventProcessor>(
        CVClient("com.example.plugin", "Plugin", "1.0", 1), ComputedEndpoint(server.url("/events")),
        CVUploadBatchEventConfig(2, false));
    ASSERT_TRUE(sessions->processorManager()->addEventProcessor(uploads));
    {
        CVSessionManager other;
        CVError error;
        EXPECT_FALSE(other.processorManager()->addEventProcessor(uploads, &error)) << "its batches are the first one's";
        EXPECT_EQ(error.domain(), "Corvane.InvalidArgument");
    }
    sessions->pushSessionData({"device", raw("Device", {{"model", "M1"}})});

    const auto view = eventClass(
        "View", {{CVEventData::dataClass(), required, "event"}, {CVDataEventClass("Screen"), required, "screen"}});
    root->pushDataEvent(raw("Screen", {{"name", "home"}}));
    for (int i = 0; i < 3; ++i) root->submitEventType(view);
    root->pushDataEvent(raw("Screen", {{"name", "\xff"}}));
    root->submitEventType(view);
    sessions->endSession();
    processor->drain();
    const auto report =
        uploads->proxyEventProcessor()->waitForDelivery(std::chrono::steady_clock::now() + std::chrono::seconds(20));
    EXPECT_EQ(report.pending.documents, 0u);
    const auto received = documentsAt(server);
    ASSERT_EQ(received.size(), 2u);
    EXPECT_EQ(eventIDs(received).size(), 3u) << "the event with the broken data is in no batch";
    EXPECT_EQ(received[0]["data"]["session"]["device"]["model"].string(), "M1");
    EXPECT_EQ(received[0]["data"]["events"][0]["data"]["screen"]["name"].string(), "home");
    EXPECT_EQ(received[0]["data"]["events"][0]["metadata"]["name"].string(), "View");

    EXPECT_FALSE(uploads->resumeBackgroundProcessingForIdentifier("not mine", [] {}));
}

}  // namespace
}  // namespace corvane::test
