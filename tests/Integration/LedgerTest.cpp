#include <corvane/Testing/FakeTransferSession.h>
#include <corvane/Testing/ProcessSettings.h>

#include "tests/Integration/FaultFixture.h"

#include <corvane/Platform/PrivateFile.h>
#include <corvane/Platform/UUID.h>
#include <corvane/Upload/LedgerEntity.h>

#include <future>
#include <map>

namespace corvane::test {
namespace {

struct Unpushed {
    std::string name;
};
struct Incomplete {
    EventProperty<EventData> event = required;
    EventProperty<Unpushed> unpushed = required;
};

/// Everything in the ledger that is not 0, as "<what> <events>/<documents>".
std::string text(const Ledger& ledger) {
    std::string text;
    const auto add = [&](const char* name, const Ledger::Count& count) {
        if (count == Ledger::Count()) return;
        text += (text.empty() ? "" : ", ") + std::string(name) + ' ' + std::to_string(count.events) + '/' +
                std::to_string(count.documents);
    };
    add("open", ledger.open);
    add("waiting", ledger.waiting);
    add("delivered", ledger.delivered);
    add("4xx", ledger.refused.status4xx);
    add("3xx", ledger.refused.status3xx);
    add("attempts", ledger.givenUp.attempts);
    add("payload", ledger.givenUp.payloadMissing);
    add("size", ledger.givenUp.size);
    add("age", ledger.givenUp.age);
    add("forgotten", ledger.givenUp.forgotten);
    add("unknown", ledger.unknown);
    add("again", ledger.sentAgain);
    add("UNACCOUNTED", {ledger.unaccounted, 0});
    return text;
}

/// Transfers that end when the test says so.
class Books : public ::testing::Test, protected FaultFixture {
  protected:
    Books() { settings.setTransfers(FakeTransferSession::factory(session)); }

    std::unique_ptr<Application> start(int batchSize) { return start({.batchSize = batchSize}); }
    std::unique_ptr<Application> start(const UploadBatchEventOptions& options) {
        auto application =
            std::make_unique<Application>("https://collector.example.com/in", UploadBatchEventConfig(options));
        application->drain();
        return application;
    }
    std::string ledger(Application& application) {
        application.drain();
        return text(application.uploads->ledger());
    }
    /// As it is on disk.
    std::string ledgerOnDisk(const Application& application) {
        std::promise<Ledger> told;
        application.uploads->readLedger([&](const Ledger& ledger) { told.set_value(ledger); });
        return text(told.get_future().get());
    }
    /// Forgets, and says how much, and why not all.
    std::string forget(Application& application) {
        std::promise<std::string> told;
        application.sessions.forget([&](const ForgottenRecords& forgotten, const AnyError* error) {
            told.set_value(std::to_string(forgotten.events) + '/' + std::to_string(forgotten.documents) +
                           (error ? std::string(": ") + error->what() : ""));
        });
        return told.get_future().get();
    }

    std::shared_ptr<FakeTransferSession> session;
    ProcessSettings settings;
};

TEST_F(Books, CountEverythingOnceInOnePlaceOverRetriesAndRuns) {
    auto application = start(2);
    EXPECT_EQ(ledger(*application), "");
    application->submit(11);
    EXPECT_EQ(ledger(*application), "open 1/1, waiting 10/5");
    for (const auto& [task, status] : {std::pair(1, 200), {2, 404}, {3, 503}, {4, 301}})
        session->complete(task, status);
    const std::string after = "open 1/1, waiting 4/2, delivered 2/1, 4xx 2/1, 3xx 2/1, again 2/1";
    EXPECT_EQ(ledger(*application), after);
    EXPECT_EQ(ledgerOnDisk(*application), after) << "what is on disk is what is in memory";
    EXPECT_EQ(application->uploads->ledger().accepted(), (Ledger::Count{11, 5}));
    EXPECT_EQ(application->uploads->ledger().acceptedInRun, 11);

    const auto tracker = application->sessions.tracker();
    for (int i = 0; i < 3; ++i) tracker->submit<Incomplete>();
    application->sessions.end();
    tracker->submit<ScreenView>();
    application->drain();
    session->complete(6, 200);
    session->complete(5, 503);
    EXPECT_EQ(ledger(*application), "waiting 4/2, delivered 3/2, 4xx 2/1, 3xx 2/1, again 4/2");
    application->abandon();

    auto left = rows();
    ASSERT_EQ(left.size(), 2u);
    std::filesystem::remove(dropbox() / left.at(0).identifier);
    left.at(1).retries = 99;
    Store<SignedEntity>(StoreLocation::default_("main")).insert(left.at(1));
    application = start(2);
    EXPECT_EQ(ledger(*application), "delivered 3/2, 4xx 2/1, 3xx 2/1, attempts 2/1, payload 2/1, again 4/2");
    const auto last = application->uploads->ledger();
    EXPECT_EQ(last.notAccepted, (Ledger::NotAccepted{.noSession = 1, .missingData = 3}));
    EXPECT_EQ(last.accepted(), (Ledger::Count{11, 6}));
    EXPECT_EQ(last.acceptedInRun, 0);
}

TEST_F(Books, NameWhatProgramsThatKeepNoneHaveDoneAndWhatNoRowStoodFor) {
    auto application = start(1);
    application->submit(3);
    application->drain();
    const auto other = std::make_shared<StoreConnection>(StoreLocation::default_("main"));
    Store<SignedEntity> requests(other);
    const auto stored = requests.fetchAll();
    requests.deleteWhere("identifier", stored.at(0).identifier);
    for (const int task : {1, 2, 3}) session->complete(task, 503);
    EXPECT_EQ(ledger(*application), "waiting 3/3, again 2/2");
    application->abandon();
    auto foreign = stored.at(1);
    foreign.identifier = "another program's";
    requests.insert(foreign);
    application = start(1);
    EXPECT_EQ(ledger(*application), "waiting 2/2, payload 0/1, unknown 1/1, again 2/2");

    // Neither the document's row nor the batch's can be written: the document goes out all the same.
    for (const char* table : {"upload_batches", "signed_requests"}) {
        other->run("CREATE TRIGGER no_" + std::string(table) + " BEFORE INSERT ON " + table +
                   " BEGIN SELECT RAISE(ABORT, 'full'); END;");
    }
    application->submit(2);
    EXPECT_EQ(ledger(*application), "open 2/2, waiting 2/2, payload 0/1, unknown 1/1, again 2/2");
    const auto made = static_cast<int>(session->made().size());
    session->complete(made - 1, 200);
    session->complete(made, 404);
    for (const char* table : {"upload_batches", "signed_requests"}) other->run("DROP TRIGGER no_" + std::string(table));
    application->submit(1);
    EXPECT_EQ(ledger(*application), "waiting 3/3, delivered 1/1, 4xx 1/1, payload 0/1, unknown 1/1, again 2/2");
}

/// What the documents directory holds of events, without the names that change.
std::string kept(const std::filesystem::path& directory) {
    std::map<std::string, int> kinds;
    for (const auto& file : std::filesystem::recursive_directory_iterator(directory)) {
        const auto parent = file.path().parent_path().extension().string();
        if (file.is_regular_file() && parent != "") ++kinds[parent];
    }
    std::string text;
    for (const auto& [kind, count] : kinds) text += kind + ' ' + std::to_string(count) + ' ';
    return text;
}

TEST_F(Books, ForgetDropsWhatIsNotDeliveredEverywhereAndKeepsWhatComesLater) {
    {
        Application other("https://collector.example.com/in", 2, "other");
        other.submit(3);
        other.drain();
        session->complete(1, 503);
        other.abandon();
    }
    std::filesystem::create_directory(documents / "com.veskar.corvane.other.upload-dropbox.debugging");
    const auto copy = documents / "com.veskar.corvane.other.upload-dropbox.debugging" / (newUUID() + ".request.json");
    replacePrivateFile(copy, "{}");
    // Of one endpoint the database is damaged, of another one gone.
    replacePrivateFile(documents / "com.veskar.corvane.damaged.db", std::string(4096, 'x'));
    std::filesystem::create_directory(documents / ("com.veskar.corvane." + std::string(200, 'x') + ".db"));
    for (const char* endpoint : {"damaged", "gone"}) {
        const auto payload =
            documents / ("com.veskar.corvane." + std::string(endpoint) + ".upload-dropbox") / newUUID();
        std::filesystem::create_directory(payload.parent_path());
        replacePrivateFile(payload, "{}");
        std::filesystem::last_write_time(payload, std::filesystem::file_time_type::clock::now() - 1h);
    }
    auto application = start(2);
    application->submit(5);
    application->drain();
    session->complete(1, 200);
    application->drain();
    EXPECT_EQ(kept(documents.path()), ".debugging 1 .upload-dropbox 4 ");

    int told = 0;
    application->sessions.tracker()->submit<ScreenView>([&](const EventSubmitResult& result) {
        EXPECT_TRUE(result.succeeded() && told++ == 0) << "before it is dropped";
    });
    application->sessions.tracker()->submit<ScreenView>();
    int heard = 0;  // on the main queue
    application->uploads->setDeliveryObserver([&](const DeliveryUpdate& update) {
        heard += update.cause.reason == DeliveryUpdate::Reason::forgotten ? 1 : 0;
    });
    EXPECT_EQ(forget(*application).substr(0, 5), "8/3: ") << "the other endpoint's 3/1 among them";
    std::filesystem::remove(documents / "com.veskar.corvane.damaged.db");
    EXPECT_EQ(told, 1);
    EXPECT_EQ(kept(documents.path()), "");
    for (const int task : {2, 3}) EXPECT_TRUE(session->task(task)->wasCancelled());
    EXPECT_EQ(application->wait().givenUp, (DeliveryReport::Count{4, 2}));
    std::promise<int> hadHeard;
    MainQueue::async([&] {
        application->uploads->setDeliveryObserver({});
        hadHeard.set_value(heard);
    });
    EXPECT_EQ(hadHeard.get_future().get(), 2);
    application->submit(3);
    EXPECT_EQ(ledger(*application), "open 1/1, waiting 2/1, delivered 2/1, forgotten 5/2");
    EXPECT_EQ(ledgerOnDisk(*application), ledger(*application));
    EXPECT_EQ(forget(*application), "3/1");
    EXPECT_EQ(forget(*application), "0/0");
}

TEST_F(Books, ForgetIsObeyedByOthersAndFinishedByTheNext) {
    const auto file = documents / "com.veskar.corvane.recording";
    auto application = start(2);
    application->submit(3);
    application->drain();
    replacePrivateFile(file, "on 5000000000000 0\n");  // another process, which is killed
    application->submit(1);
    EXPECT_EQ(ledger(*application), "open 1/1, forgotten 3/1") << "what comes later is kept";
    application->submit(3);
    EXPECT_EQ(ledger(*application), "waiting 4/2, forgotten 3/1");
    EXPECT_EQ(payloads().size(), 2u);
    application->sessions.endSync();
    {
        const auto writer = std::make_shared<StoreConnection>(StoreLocation::default_("main"));
        StoreConnection::setBusyTimeout(std::chrono::milliseconds(1));
        writer->transaction([&] { EXPECT_NE(forget(*application).find("locked"), std::string::npos); });
        StoreConnection::setBusyTimeout(std::chrono::seconds(5));
    }
    EXPECT_EQ(rows().size(), 2u);
    application->abandon();
    application = start(2);
    DeferredStoreCore::queue().sync([] {});
    EXPECT_EQ(rows().size() + payloads().size(), 0u);
    EXPECT_EQ(ledger(*application), "forgotten 7/3");
}

TEST_F(Books, WhatIsRecordedAfterForgettingIsSentByThisRunAndTheNext) {
    auto application = start(1);
    application->submit(2);
    application->sessions.tracker()->suspend();
    std::promise<void> forgotten;
    application->sessions.forget([&](auto&&...) { forgotten.set_value(); });
    application->submit(2);  // handed over before the transfers of before are listed
    application->sessions.tracker()->resume();
    forgotten.get_future().wait();
    application->drain();
    for (const auto& task : session->made()) EXPECT_EQ(task->wasCancelled(), task->identifier() <= 2);
    for (const int task : {3, 4}) session->complete(task, 503);
    application->abandon();
    application = start(1);
    application->drain();
    ASSERT_TRUE(session->waitForTasks(2));
    application->drain();
    for (const auto& task : session->made()) EXPECT_FALSE(task->wasCancelled()) << "it has nothing of before";
    EXPECT_EQ(application->uploads->waitForDelivery({}).pending.documents, 2);
}

TEST_F(Books, BoundsGiveTheOldestDocumentsUpOnceTheyAreWithdrawnAndNoOpenBatch) {
    settings.setTransfers([this, open = FakeTransferSession::factory(session)](auto... arguments) {
        auto opened = open(std::move(arguments)...);
        session->scriptCancel(std::nullopt);
        return opened;
    });
    auto application = start({.batchSize = 2, .maximumBytesOnDisk = 1});
    application->sessions.tracker()->chain("menu")->enterGroup("menu");
    application->submit(4);
    EXPECT_EQ(ledger(*application), "waiting 4/2") << "both are being withdrawn";
    EXPECT_EQ(log.count("More is stored than is allowed"), 1);
    session->complete(1, 200);  // it gets through all the same
    session->complete(2, FakeTransferSession::Outcome::failure(TransferError::Code::cancelled));
    EXPECT_EQ(ledger(*application), "delivered 2/1, size 2/1");
    EXPECT_EQ(payloads().size() + rows().size(), 0u);
    application->submit(2);
    application->drain();
    session->complete(3, 503);
    EXPECT_EQ(ledger(*application), "delivered 2/1, size 4/2") << "nothing is sent again";
    EXPECT_EQ(application->wait(), (DeliveryReport{{2, 1}, {}, {4, 2}}));
    EXPECT_EQ(log.count("More is stored than is allowed"), 2) << "once for each time";
    application->abandon();

    // What is counted is compared with what is there; a start gives up what is too old before it was sent again.
    application = start(1);
    application->submit(3);
    application->drain();
    for (const int task : {1, 2, 3}) session->complete(task, 503);
    application->abandon();
    auto old = rows().at(0);
    old.createdDate -= std::chrono::hours(2);
    Store<SignedEntity>(StoreLocation::default_("main")).insert(old);
    std::filesystem::resize_file(dropbox() / rows().at(0).identifier, 100'000);
    application = start({.batchSize = 2, .maximumBytesOnDisk = 90'000, .maximumAge = std::chrono::hours(1)});
    application->drain();
    ASSERT_TRUE(session->waitForTasks(1));
    EXPECT_EQ(ledger(*application), "waiting 1/1, delivered 2/1, size 5/3, age 1/1, again 3/3");

    // Another process has delivered what this one counts, and writes what it does not.
    application->submit(2);
    application->drain();
    const auto size = static_cast<std::int64_t>(std::filesystem::file_size(dropbox() / rows().at(1).identifier));
    session->complete(2, 503);
    session->complete(1, 200);
    application->abandon();
    application = start({.batchSize = 2, .maximumBytesOnDisk = size * 4});
    ASSERT_TRUE(session->waitForTasks(1));
    const auto other = std::make_shared<StoreConnection>(StoreLocation::default_("main"));
    for (int i = 0; i < 8; ++i) {
        application->submit(2);
        application->drain();
        for (const char* table : {"signed_requests", "documents"})
            other->run("DELETE FROM " + std::string(table) + ";");
    }
    for (const auto& task : session->made()) EXPECT_FALSE(task->wasCancelled());
    old.identifier = "another's";
    old.createdDate = now();
    Store<SignedEntity>(other).insert(old);
    Store<DocumentEntity>(other).insert({old.identifier, 7, 1'000'000});
    application->submit(2);
    application->drain();  // it is withdrawn first
    EXPECT_NE(ledger(*application).find("size 12/4"), std::string::npos);

    for (const UploadBatchEventOptions& bad :
         {UploadBatchEventOptions{.maximumBytesOnDisk = 0}, {.maximumAge = std::chrono::milliseconds(0)}}) {
        EXPECT_THROW(UploadBatchEventConfig{bad}, InvalidArgument);
    }
}

}  // namespace
}  // namespace corvane::test
