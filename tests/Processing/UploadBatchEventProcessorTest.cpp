#include <corvane/Processing/UploadBatches.h>

#include <corvane/Processing/FilteringEventProcessor.h>
#include <corvane/Processing/SamplingEventProcessor.h>
#include <corvane/Processing/UserEvents.h>
#include <corvane/Upload/UploadRequest.h>

#include "tests/support/PassTime.h"
#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

using Rows = Store<UploadBatchEntity>;

/// Takes documents over, or refuses them.
class FakeUploadManager final : public UploadManagerType {
  public:
    void open() override { calls.emplace_back("open"); }
    void close() override { calls.emplace_back("close"); }
    void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) override { queue = std::move(accessQueue); }
    UploadTaken upload(const UploadRequest& request) override {
        if (refuses) throw std::runtime_error("refused");
        documents.push_back(request.resource->jsonObject());
        if (didTake) didTake();
        contentType = request.resource->contentType() + " " + request.resource->version();
        if (ledger) ledger->settle(request.resource->identifier(), DeliveryLedger::Outcome::delivered);
        return taken;
    }
    bool shouldResume(std::string_view identifier, std::function<void()>) override { return identifier == "mine"; }

    /// How many events each document holds.
    [[nodiscard]] std::vector<std::size_t> sizes() const {
        std::vector<std::size_t> sizes;
        for (const auto& document : documents) sizes.push_back(document["data"]["events"].array()->size());
        return sizes;
    }

    bool refuses = false;
    UploadTaken taken = UploadTaken::recorded;
    std::function<void()> didTake;
    std::vector<JSON> documents;
    std::string contentType;
    std::vector<std::string> calls;
    std::shared_ptr<SerialQueue> queue;
    std::shared_ptr<DeliveryLedger> ledger;
};

struct Mark {
    EventProperty<Screen> screen = EventProperty<Screen>::optional;
};

class UploadBatch : public ::testing::Test {
  protected:
    void SetUp() override { launch(); }

    /// As a new run of the application does; the database stays.
    void launch(int batchSize = 3) { launch({.batchSize = batchSize}); }
    void launch(const UploadBatchEventOptions& options) {
        sessions.reset();
        manager = std::make_shared<FakeUploadManager>();
        ledger = manager->ledger = std::make_shared<DeliveryLedger>();
        store = std::make_shared<DeferredStore<UploadBatchEntity>>("main");
        batching = std::make_shared<UploadBatchEventProcessor>(std::make_shared<UploadBatches>(
            Client{"com.example.app", "App", "1.0", 1}, manager, store, UploadBatchEventConfig(options), ledger));
        sessions = std::make_unique<SessionManager>();
        sessions->processorManager()->add(batching);
        root = sessions->tracker();
    }

    void submit(int count) {
        for (int i = 0; i < count; ++i) root->submit<Mark>();
        drain();
    }
    void drain() {
        manager->queue->sync([] {});
    }
    std::vector<UploadBatchEntity> rows() {
        return store->perform([](Rows& table) {
            table.createTable();
            return table.fetchAll();
        });
    }

    CapturedLog log;
    TemporaryDocuments documents;
    std::shared_ptr<FakeUploadManager> manager;
    std::shared_ptr<DeliveryLedger> ledger;
    std::shared_ptr<DeferredStore<UploadBatchEntity>> store;
    std::shared_ptr<UploadBatchEventProcessor> batching;
    std::unique_ptr<SessionManager> sessions;
    std::shared_ptr<Tracker> root;
};

TEST_F(UploadBatch, SendsAFullSessionQueueAsOneDocumentAndBacksUpTheOpenOne) {
    sessions->push(SessionData{"user", Viewer{"7", {}}});
    sessions->start(Session::Kind::userEvents());
    root->push(Screen{"home"});
    submit(2);
    const auto backup = rows();
    ASSERT_EQ(backup.size(), 1u);
    EXPECT_EQ(backup[0].events->count(), 2u);
    EXPECT_EQ(backup[0].session["user"]["id"].string(), "7");

    submit(2);
    ASSERT_EQ(manager->sizes(), (std::vector<std::size_t>{3}));
    const JSON& document = manager->documents[0];
    EXPECT_EQ(manager->contentType, "application/vnd.veskar.corvane.user_events+json 0.1.0");
    EXPECT_EQ(document["metadata"]["version"].string(), "0.1.0");
    EXPECT_NE(document["metadata"]["identifier"].string(), backup[0].identifier);
    EXPECT_EQ(document["data"]["session"].text(), backup[0].session.text());
    EXPECT_EQ(document["data"]["events"][2].text(),
              R"({"data":{"screen":{"name":"home"}},"metadata":{"name":"Mark","version":"0.1.0"}})");
    ASSERT_EQ(rows().size(), 1u) << "the fourth event began a queue of its own";
    EXPECT_NE(rows()[0].identifier, backup[0].identifier);

    sessions->push(SessionData{"user", Viewer{"8", {}}}, {}, true);
    drain();
    ASSERT_EQ(manager->sizes(), (std::vector<std::size_t>{3, 1}));
    EXPECT_EQ(manager->documents[1]["data"]["session"]["user"]["id"].string(), "7") << "before its data changes";
}

TEST_F(UploadBatch, ABackupThatGrewWhileItWasSentStaysForItsOwner) {
    sessions->start(Session::Kind::userEvents());
    submit(1);
    UploadBatchEntity batch = rows().at(0);
    launch();
    manager->didTake = [&] {  // the other process goes on at this moment
        auto events = std::make_shared<EncodedEvents>(*batch.events);
        events->append(JSON("{}"));
        batch.events = events;
        store->perform([&](Rows& table) { table.insert(batch); });
    };
    sessions->start(Session::Kind::userEvents());
    drain();
    EXPECT_EQ(manager->sizes(), std::vector<std::size_t>{1});
    ASSERT_EQ(rows().size(), 1u);
    EXPECT_EQ(rows()[0].events->count(), 2u);
}

TEST_F(UploadBatch, ADocumentThatIsUnderWayWithoutARowStaysInItsBackup) {
    sessions->start(Session::Kind::userEvents());
    drain();
    manager->taken = UploadTaken::underWay;
    submit(3);
    EXPECT_EQ(rows().size(), 1u);

    // A batch that has no backup either gets one as soon as something can be written, unless it got through before.
    store->perform([](Rows& table) { table.dropTable(); });
    manager->ledger = nullptr;
    submit(6);
    EXPECT_EQ(manager->sizes(), (std::vector<std::size_t>{3, 3, 3}));
    EXPECT_GE(log.count("Failed to write queue to disk for backup uploads, identifier="), 2) << "by how runs fall";
    ledger->settle(*manager->documents[1]["metadata"]["identifier"].string(), DeliveryLedger::Outcome::delivered);
    ledger->settle(*manager->documents[2]["metadata"]["identifier"].string(), DeliveryLedger::Outcome::pending);
    EXPECT_EQ(log.count("Failed to clean up"), 0) << "what was not written is not deleted";
    rows();  // makes the table
    manager->taken = UploadTaken::recorded;
    submit(1);
    EXPECT_EQ(rows().size(), 2u);
    launch();
    sessions->start(Session::Kind::userEvents());
    drain();
    EXPECT_EQ(manager->sizes(), (std::vector<std::size_t>{3, 1}));
    EXPECT_TRUE(rows().empty());
}

TEST_F(UploadBatch, ABurstSharesItsWritesAndALargeBatchHasRowsOfItsOwnSize) {
    launch(1000);
    sessions->start(Session::Kind::userEvents());
    drain();
    StoreConnection counting(StoreLocation::default_("main"));
    counting.run(
        "CREATE TABLE writes (n); CREATE TRIGGER counts AFTER INSERT ON upload_batches "
        "BEGIN INSERT INTO writes VALUES (1); END;");
    int acknowledged = 0;
    std::vector<std::size_t> onDisk;
    root->suspend();
    for (int i = 0; i < 200; ++i) {
        root->submit<Mark>([&](const EventSubmitResult& result) {
            acknowledged += result.succeeded();
            if (acknowledged == 1) {
                for (const auto& row : rows()) onDisk.push_back(row.events->count());
            }
        });
    }
    root->resume();
    drain();
    EXPECT_EQ(acknowledged, 200);
    std::sort(onDisk.begin(), onDisk.end());
    EXPECT_EQ(onDisk, (std::vector<std::size_t>(4, 50))) << "all are there before the first is acknowledged";
    std::int64_t writes = 0;
    counting.query("SELECT count(*) FROM writes;", [&](StoreStepper& row) { writes = row.integer(); });
    EXPECT_LE(writes, 8) << "not one for each event";
    sessions->endSync();
    EXPECT_EQ(manager->sizes(), std::vector<std::size_t>{200});
    EXPECT_TRUE(rows().empty());

    // A batch that fills up before anybody could tell never has a row.
    launch(10);
    sessions->start(Session::Kind::userEvents());
    drain();
    counting.run("DELETE FROM writes;");
    root->suspend();
    for (int i = 0; i < 25; ++i) root->submit<Mark>();
    root->resume();
    drain();
    counting.query("SELECT count(*) FROM writes;", [&](StoreStepper& row) { writes = row.integer(); });
    EXPECT_EQ(manager->sizes(), (std::vector<std::size_t>{10, 10}));
    EXPECT_LE(writes, 1);
}

TEST_F(UploadBatch, WhatIsOpenGoesOutInPlaceOfABackupThatIsBehind) {
    sessions->start(Session::Kind::userEvents());
    submit(1);
    manager->refuses = true;
    const auto outdated = rows().at(0);
    submit(4);
    sessions->endSync();
    sessions->start(Session::Kind::userEvents());
    drain();
    EXPECT_EQ(log.count("Failed to submit rehydrated request for upload, error=refused"), 1);
    sessions->endSync();
    EXPECT_EQ(log.count("session/queue key mismatch"), 1) << "a queue of an earlier session waits for its backup";
    EXPECT_EQ(manager->calls, (std::vector<std::string>{"open", "close", "open", "close"}));
    manager->refuses = false;
    // A lock keeps the row as it was, also while the next session starts.
    StoreConnection::setBusyTimeout(1ms);
    StoreConnection other(StoreLocation::default_("main"));
    store->perform([&](Rows& table) { table.insert(outdated); });
    other.run("BEGIN IMMEDIATE;");
    sessions->start(Session::Kind::userEvents());
    drain();
    EXPECT_EQ(manager->sizes(), (std::vector<std::size_t>{5}));
    other.run("COMMIT;");
}

TEST_F(UploadBatch, EventsSubmittedWhileABatchIsHandedOverGoIntoABatchOfTheirOwn) {
    sessions->start(Session::Kind::userEvents());
    drain();
    int depth = 0;
    manager->didTake = [&] {
        if (depth++ > 0) return;
        for (int i = 0; i < 4; ++i) batching->process(ProcessEvent("Inline", JSON("{}"), std::nullopt));
    };
    submit(3);
    EXPECT_EQ(manager->sizes(), (std::vector<std::size_t>{3, 3}));
    EXPECT_EQ(rows().size(), 1u);

    // The same in front of a refusal: what was refused stays before what came after it, in one row.
    manager->didTake = [&] {
        if (depth++ < 3) batching->process(ProcessEvent("Inline", JSON("{}"), std::nullopt));
        throw std::runtime_error("refused late");
    };
    submit(2);
    ASSERT_EQ(rows().size(), 1u);
    EXPECT_EQ(rows()[0].events->count(), 4u);
    EXPECT_EQ(JSON("[" + rows()[0].events->text() + "]")[3]["metadata"]["name"].string(), "Inline");
}

TEST_F(UploadBatch, RecoveredTextGoesOutAsItWasWrittenAndABadRowHoldsBackNoOther) {
    const std::string events =
        R"({"data":{"a":-0,"b":12345678901234567890123,"b":1.10},"metadata":{"name":"N","version":"0"}})";
    const auto put = [&](const std::string& identifier, const std::string& blob, const std::string& session) {
        StoreConnection(StoreLocation::default_("main"))
            .run("INSERT INTO upload_batches VALUES ('" + identifier + "', " + StorableValue::bytes(blob).sqlLiteral() +
                 ", " + StorableValue::bytes(session).sqlLiteral() + ");");
    };
    rows();
    put("cut off", R"({"events":[)" + events, "{}");
    put("no object", R"({"events":[1]})", "{}");
    put("no session", R"({"events":[]})", "[]");
    put("two keys", R"({"events":[],"events":[{"n":1}]})", "{}");
    put("blanks", R"({ "events" : [ { "n" : 2 } ] })", "{}");
    put("good", R"({"events":[)" + events + "," + events + "]}", R"({"s":1E2,"s":1.0})");
    for (int i = 0; i < 3; ++i)
        put("large" + std::to_string(i), R"({"events":[{"t":")" + std::string(300'000, 'x') + R"("}]})", "{}");
    std::size_t before = 0;
    root->suspend();  // so that the event waits behind the start of the session
    sessions->start(Session::Kind::userEvents());
    root->submit<Mark>([&](const EventSubmitResult&) { before = manager->documents.size(); });
    root->resume();
    drain();
    EXPECT_LT(before, 6u) << "a new session's events need not wait for all of them";
    const auto report = batching->waitForDelivery(std::chrono::steady_clock::now() + 10s);
    EXPECT_EQ(report.delivered.documents, 6);
    EXPECT_EQ(report.pending.documents, 0);
    EXPECT_EQ(manager->sizes(), (std::vector<std::size_t>{1, 1, 2, 1, 1, 1}));
    EXPECT_EQ(manager->documents[0]["data"]["events"].text(), R"([{"n":1}])");
    EXPECT_NE(manager->documents[2].text().find(events + "," + events), std::string::npos);
    EXPECT_NE(manager->documents[2].text().find(R"({"s":1E2,"s":1.0})"), std::string::npos);
    EXPECT_EQ(store->perform([](Rows& table) { return table.keys(); }).size(), 3u + 1) << "the bad ones stay";
    for (const char* bad : {"cut off", "no object", "no session"}) {
        EXPECT_EQ(log.count("Failed to submit rehydrated failed queues, error=" + std::string(bad) + ": bad data"), 1);
    }
}

TEST_F(UploadBatch, TextThatOnlyClaimsToBeJSONReachesNeitherRowNorDocument) {
    const std::string deep = std::string(200, '[') + std::string(200, ']');
    sessions->start(Session::Kind::userEvents());
    sessions->transaction([&](AccessSessionManager&) {
        for (const std::string& text : {std::string("{broken"), std::string(R"({"n":1e999})"),
                                        std::string("{\"\xff\":1}"), std::string("[]"), R"({"deep":)" + deep + "}"}) {
            sessions->processorManager()->process(ProcessEvent("E", JSON::fromEncodedText(text), {}));
        }
        batching->didUpdateSession({"S", Session::Kind::userEvents(), Date(), JSON::fromEncodedText("{broken")}, false);
        batching->process(ProcessEvent("E", JSON::fromEncodedText(R"({"n":1})"), {}));
    });
    drain();
    EXPECT_EQ(log.count("Failed to process event for batching, error="), 5);
    EXPECT_EQ(log.count("Session data is not a JSON object"), 1);
    ASSERT_EQ(rows().size(), 1u);
    EXPECT_EQ(rows()[0].events->count(), 1u);
    EXPECT_EQ(rows()[0].session.text(), "{}");
}

TEST_F(UploadBatch, WrappedItRecoversInADroppedSessionAndWritesWhatItAcknowledges) {
    sessions->start(Session::Kind::userEvents());
    submit(2);
    launch();
    sessions->processorManager()->remove(batching);
    int asked = 0;
    const auto filter = std::make_shared<FilteringEventProcessor>(batching, [&](const ProcessEvent& event) {
        return ++asked == 2 ? std::nullopt : std::optional(ProcessEvent("Seen", event.json(), event.groupName()));
    });
    sessions->processorManager()->add(std::make_shared<SamplingEventProcessor>(filter, 1));
    sessions->start(Session::Kind::userEvents());
    std::vector<std::string> onDisk;
    const auto look = [&](const EventSubmitResult& result) {
        EXPECT_EQ(result.event()->name(), "Mark") << "as it was submitted";
        onDisk.push_back(std::to_string(asked) + ": " + rows().at(0).events->text());
    };
    for (int i = 0; i < 2; ++i) {
        root->submit<Mark>(look);
        drain();
    }
    EXPECT_EQ(manager->sizes(), std::vector<std::size_t>{2});
    const std::string seen = R"({"data":{},"metadata":{"name":"Seen","version":"0.1.0"}})";
    EXPECT_EQ(onDisk, (std::vector<std::string>{"1: " + seen, "2: " + seen}));
    EXPECT_EQ(filter->droppedEvents(), 1u);

    // Left open, that batch goes out from a session of which nothing is kept.
    launch();
    sessions->processorManager()->remove(batching);
    const auto sampling = std::make_shared<SamplingEventProcessor>(batching, std::numeric_limits<int>::max());
    sessions->processorManager()->add(sampling);
    sessions->start(Session::Kind::userEvents());
    submit(5);
    EXPECT_EQ(manager->sizes(), std::vector<std::size_t>{1});
    EXPECT_EQ(sampling->droppedEvents(), 5u);
    EXPECT_TRUE(rows().empty());
}

TEST_F(UploadBatch, ASessionsBatchGoesOutWhenItsOldestEventHasWaitedLongEnough) {
    for (const std::chrono::milliseconds bad : {0ms, -1ms}) {
        EXPECT_THROW(UploadBatchEventConfig({.maximumDelay = bad}), InvalidArgument);
        EXPECT_THROW(UploadBatchEventConfig({.retryDelay = bad}), InvalidArgument);
    }
    launch({.batchSize = 3, .maximumDelay = 1h});
    sessions->start(Session::Kind::userEvents());
    const auto group = root->chain("group");
    group->enterGroup("g");
    for (int i = 0; i < 5; ++i) group->submit<Mark>();
    const auto pass = [&](std::chrono::minutes time) { passTime(*manager->queue, time); };
    using Sizes = std::vector<std::size_t>;
    pass(2h);
    EXPECT_EQ(manager->sizes(), Sizes{}) << "a group's waits until it is left";

    submit(1);
    pass(40min);
    submit(1);
    pass(30min);
    EXPECT_EQ(manager->sizes(), Sizes{2});
    submit(4);  // a full batch, and the first of the next
    pass(50min);
    EXPECT_EQ(manager->sizes(), (Sizes{2, 3}));
    batching->flush();
    submit(1);
    pass(50min);
    EXPECT_EQ(manager->sizes(), (Sizes{2, 3, 1})) << "the time is that of the batch that is open";

    manager->refuses = true;
    pass(20min);
    EXPECT_EQ(log.count("Failed to submit request for upload, error=refused"), 1);
    submit(1);
    manager->refuses = false;
    sessions->setRecording(false);
    root->suspend();
    BootClock::advance(1h);
    EXPECT_EQ(manager->sizes(), (Sizes{2, 3, 1})) << "not while the queue is suspended";
    root->resume();
    pass(0min);
    EXPECT_EQ(manager->sizes(), (Sizes{2, 3, 1, 2})) << "what was recorded goes out";

    sessions->setRecording(true);
    submit(1);
    sessions->endSync();
    EXPECT_EQ(manager->documents.size(), 6u);
    sessions->start(Session::Kind::userEvents());
    pass(59min);
    submit(1);
    pass(59min);
    EXPECT_EQ(manager->documents.size(), 6u) << "nothing is left of the last session's time";
    EXPECT_EQ(rows().size(), 1u);
}

TEST_F(UploadBatch, WaitsForDeliveryNoLongerThanAsked) {
    sessions->start(Session::Kind::userEvents());
    manager->ledger = nullptr;
    submit(3);
    const auto report = batching->waitForDelivery(std::chrono::steady_clock::now());
    EXPECT_EQ(report.pending, (DeliveryReport::Count{3, 1}));
    root->suspend();
    EXPECT_EQ(batching->waitForDelivery(std::chrono::steady_clock::now() + 1ms), report) << "a suspended queue too";
    root->resume();

    // A document is settled inside the callback that brings its outcome; what follows that callback is waited for too.
    std::promise<void> settled, goOn;
    manager->queue->async([&] {
        ledger->settle(*manager->documents[0]["metadata"]["identifier"].string(), DeliveryLedger::Outcome::delivered);
        settled.set_value();
        goOn.get_future().wait();
    });
    settled.get_future().wait();
    auto waiting = std::async(std::launch::async,
                              [&] { return batching->waitForDelivery(std::chrono::steady_clock::now() + 10s); });
    EXPECT_EQ(waiting.wait_for(20ms), std::future_status::timeout);
    goOn.set_value();
    EXPECT_EQ(waiting.get().delivered, (DeliveryReport::Count{3, 1}));
}

}  // namespace
}  // namespace corvane::test
