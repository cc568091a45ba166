#include "tests/Integration/FaultFixture.h"

#include <corvane/Platform/PrivateFile.h>
#include <corvane/Processing/UploadBatchEntity.h>

#include <signal.h>
#include <sys/resource.h>

#include <future>

namespace corvane::test {
namespace {

using Reply = ScriptedServer::Reply;

constexpr const char* notBackedUp = "Failed to write queue to disk for backup uploads, identifier=";

class DiskFaults : public ::testing::Test, protected FaultFixture {
  protected:
    /// Submits events that share no writes, and counts in `unsaid_` those that were acknowledged before the log held
    /// one `notBackedUp` more.
    void submitUnsaved(Application& application, int count) {
        const int before = log.count(notBackedUp);
        for (int i = 1; i <= count; ++i) {
            application.sessions.tracker()->submit<ScreenView>(
                [this, said = before + i](const EventSubmitResult& result) {
                    if (!result.succeeded() || log.count(notBackedUp) < said) ++unsaid_;
                });
            application.sessions.tracker()->transaction({});
        }
        application.wait();
    }
    /// Submits an event that is expected to be safe on disk when it is acknowledged.
    void submitSaved(Application& application, int count = 1) {
        const int before = log.count(notBackedUp);
        application.submit(count);
        application.wait();
        EXPECT_EQ(log.count(notBackedUp), before);
    }

    std::atomic<int> unsaid_ = 0;
};

/// Makes every write to a file fail as on a full disk.
class FullDisk {
  public:
    FullDisk() : handler_(signal(SIGXFSZ, SIG_IGN)) {
        getrlimit(RLIMIT_FSIZE, &before_);
        const rlimit none{0, before_.rlim_max};
        setrlimit(RLIMIT_FSIZE, &none);
    }
    FullDisk(const FullDisk&) = delete;
    FullDisk& operator=(const FullDisk&) = delete;
    ~FullDisk() {
        setrlimit(RLIMIT_FSIZE, &before_);
        signal(SIGXFSZ, handler_);
    }

  private:
    rlimit before_{};
    void (*handler_)(int);
};

TEST_F(DiskFaults, AMissingDirectoryIsMade) {
    DocumentsDirectory::set(documents / "not/yet");
    Application application(server.url(), 1);
    submitSaved(application);
    EXPECT_EQ(application.wait().delivered, (DeliveryReport::Count{1, 1}));
    EXPECT_EQ(permissions(documents / "not"), 0700u);
    EXPECT_EQ(log.count("Failed"), 0);
}

TEST_F(DiskFaults, WhatAFullDiskKeepsFromBeingForgottenIsForgottenOnceThereIsRoom) {
    Application application(server.url(), 10);
    submitSaved(application, 2);
    const auto look = [&] {
        std::promise<void> told;
        application.uploads->readLedger([&](const Ledger&) { told.set_value(); });
        told.get_future().wait();
    };
    replacePrivateFile(documents / "com.veskar.corvane.recording", "on 5000000000000 0\n");  // another process
    {
        const FullDisk full;
        look();
    }
    EXPECT_EQ(log.count("Failed to read the ledger, error="), 2);
    look();
    EXPECT_TRUE(Store<UploadBatchEntity>(StoreLocation::default_("main")).fetchAll().empty());
    EXPECT_EQ(application.uploads->ledger().givenUp.forgotten.events, 2);
}

TEST_F(DiskFaults, WithoutADirectoryTheStoreIsInMemoryAndADocumentWaitsUntilItsPayloadCanBeWritten) {
    writeFile(documents / "file", "");
    DocumentsDirectory::set(documents / "file");
    Application application(server.url(), 1);
    application.submit(2);
    EXPECT_EQ(application.wait().delivered.documents, 0);
    std::filesystem::remove(documents / "file");
    application.submit();
    EXPECT_EQ(application.wait().delivered, (DeliveryReport::Count{3, 1}));
    for (const char* table : {"upload_batches", "signed_requests"}) {
        EXPECT_EQ(log.count("Failed to create store for " + std::string(table) + ", error=cannot open the database"),
                  1);
    }
    EXPECT_EQ(log.count("Failed to submit request for upload, error="), 2);
    EXPECT_EQ(log.count(notBackedUp), 0) << "memory is the store then";
}

TEST_F(DiskFaults, AFullDiskIsToldOfBeforeEachCompletionAndCostsNothingOnceThereIsRoom) {
    {
        Application application(server.url());
        submitSaved(application);
        {
            const FullDisk full;
            submitUnsaved(application, 3);
            application.sessions.endSync();
            EXPECT_EQ(log.count("Failed to submit request for upload, error=cannot write file"), 1);
        }
        application.sessions.start(Session::Kind::userEvents());
        submitSaved(application);
        application.sessions.endSync();
        application.wait();
    }
    EXPECT_EQ(unsaid_, 0);
    EXPECT_EQ(distinctEvents(), 5u);
    EXPECT_TRUE(payloads().empty());
}

TEST_F(DiskFaults, WhatIsRemovedUnderARunningApplicationIsToldOfAndMadeAnew) {
    for (const bool isSessionOver : {false, true}) {
        SCOPED_TRACE(isSessionOver);
        {
            Application application(server.url());
            submitSaved(application);
            if (isSessionOver) application.sessions.endSync();
            application.wait();
            std::filesystem::remove_all(documents.path());
            if (isSessionOver) {
                application.sessions.start(Session::Kind::userEvents());
                submitSaved(application);
                EXPECT_EQ(log.count("Failed to open handle to the store, error="), 1);
            } else {
                submitUnsaved(application, 1);
            }
            submitSaved(application, 2);
            application.abandon();
        }
        EXPECT_EQ(unsaid_, 0);
        EXPECT_EQ(runAgain().delivered.documents, 1);
        EXPECT_EQ(distinctEvents(), isSessionOver ? 8u : 4u);
    }
}

TEST_F(DiskFaults, ALockCostsOneTimeoutAndIsToldOfBeforeEachCompletion) {
    StoreConnection::setBusyTimeout(1s);
    constexpr int events = 100;
    {
        Application application(server.url(), 1000);
        submitSaved(application);
        StoreConnection other(StoreLocation::default_("main"));
        other.run("BEGIN EXCLUSIVE;");
        const auto start = std::chrono::steady_clock::now();
        submitUnsaved(application, events);
        EXPECT_LT(std::chrono::steady_clock::now() - start, 60s) << "a timeout for each would be 100 seconds";
        other.run("COMMIT;");
        submitSaved(application);
        application.abandon();
    }
    EXPECT_EQ(unsaid_, 0);
    EXPECT_EQ(runAgain().delivered.documents, 3) << "one for each row";
    EXPECT_EQ(distinctEvents(), static_cast<std::size_t>(events) + 2);

    StoreConnection other(StoreLocation::default_("main"));
    other.run("BEGIN EXCLUSIVE;");
    Application application(server.url(), 1);
    application.submit();
    EXPECT_EQ(application.wait().delivered, (DeliveryReport::Count{1, 1})) << "out of the memory store";
    EXPECT_EQ(log.count("Failed to create store for "), 2);
    EXPECT_GE(log.count("database is locked"), events) << "the reason is in each line";
}

TEST_F(DiskFaults, ABrokenDatabaseIsToldOfAndHoldsUpNothingNew) {
    const auto run = [](const char* sql) { StoreConnection(StoreLocation::default_("main")).run(sql); };
    const auto size = [&] { return std::filesystem::file_size(database()); };
    constexpr const char* fallback = ". Attempt fallback to in-memory";
    const struct {
        const char* name;
        std::function<void()> breakIt;
        const char* says;
        int documents;  // that arrive with the next run, its own included
    } cases[] = {
        {"not a database", [&] { writeFile(database(), std::string(8192, 'x')); }, fallback, 1},
        {"cut off in its first page", [&] { std::filesystem::resize_file(database(), 1000); }, fallback, 1},
        {"cut off by half", [&] { std::filesystem::resize_file(database(), size() / 2 / 4096 * 4096); }, "malformed",
         1},
        {"empty", [&] { std::filesystem::resize_file(database(), 0); }, "diskVersion=nil", 1},
        {"a row with broken JSON",
         [&] { run("INSERT INTO upload_batches VALUES ('bad', x'7b226576656e7473223a5b', x'7b7d');"); },
         "Failed to submit rehydrated failed queues, error=bad", 3},
    };
    for (const auto& one : cases) {
        SCOPED_TRACE(one.name);
        const CapturedLog lines;
        {
            // Leaves a document that was not delivered and an open batch.
            server.script(Reply::status(503));
            Application before(server.url(), 2);
            before.submit(2);
            before.wait();
            before.submit();
            before.abandon();
        }
        one.breakIt();
        {
            Application application(server.url());
            application.submit();
            application.sessions.endSync();
            EXPECT_EQ(application.wait().delivered.documents, one.documents);
            EXPECT_EQ(application.wait().pending.documents + application.wait().givenUp.documents, 0);
            application.abandon();
        }
        EXPECT_GE(lines.count(one.says), 1);
        if (one.documents == 3) {
            run("DELETE FROM upload_batches WHERE identifier = 'bad';");
            EXPECT_EQ(runAgain().delivered.documents, 0) << "the good ones have arrived";
            EXPECT_TRUE(payloads().empty());
        }
        std::filesystem::remove_all(documents.path());
    }
}

TEST_F(DiskFaults, ADocumentWhoseRowCannotBeWrittenGoesOutAgainFromItsBackup) {
    {
        Application application(server.url(), 2);
        application.wait();
        StoreConnection other(StoreLocation::default_("main"));
        other.run("CREATE TRIGGER refuse BEFORE INSERT ON signed_requests BEGIN SELECT RAISE(FAIL, 'full'); END;");
        server.script(Reply::status(500), 3);
        application.submit(6);
        EXPECT_EQ(application.wait(), (DeliveryReport{.delivered = {}, .pending = {6, 3}, .givenUp = {}}));
        application.abandon();
        other.run("DROP TRIGGER refuse;");
    }
    EXPECT_EQ(runAgain().delivered.documents, 3);
    EXPECT_EQ(distinctEvents(), 6u);
}

TEST_F(DiskFaults, APayloadThatIsNotWhatItWasEndsItsDocumentAlone) {
    using Path = std::filesystem::path;
    const DeliveryReport oneLost{.delivered = {0, 1}, .pending = {}, .givenUp = {0, 1}};
    const DeliveryReport bothArrive{.delivered = {0, 2}, .pending = {}, .givenUp = {}};
    const auto swap = [](const Path& first, const Path& second) {
        std::filesystem::rename(first, first.string() + "x");
        std::filesystem::rename(second, first);
        std::filesystem::rename(first.string() + "x", second);
    };
    const struct {
        const char* name;
        std::function<void(const Path&, const Path&)> spoil;
        DeliveryReport report;
        std::size_t events;
    } cases[] = {
        {"missing", [](const Path& first, const Path&) { std::filesystem::remove(first); }, oneLost, 1},
        {"empty", [](const Path& first, const Path&) { std::filesystem::resize_file(first, 0); }, oneLost, 1},
        {"torn", [](const Path& first, const Path&) { std::filesystem::resize_file(first, 100); }, oneLost, 1},
        {"zeros", [](const Path& first, const Path&) { writeFile(first, std::string(100, '\0')); }, oneLost, 1},
        {"swapped", swap, bothArrive, 2},
    };
    for (const auto& one : cases) {
        SCOPED_TRACE(one.name);
        {
            ScriptedServer away;
            away.script(Reply::status(503), 2);
            Application before(away.url(), 1);
            before.submit(2);
            before.wait();
        }
        const auto left = payloads();
        ASSERT_EQ(left.size(), 2u);
        one.spoil(left[0], left[1]);
        const auto arrived = distinctEvents();
        EXPECT_EQ(runAgain(), one.report);
        EXPECT_EQ(distinctEvents() - arrived, one.events);
        EXPECT_TRUE(rows().empty());
        EXPECT_TRUE(payloads().empty());
    }
    EXPECT_EQ(log.count("Retry dropped for missing upload file, identifier="), 4);
    EXPECT_EQ(log.count("Payload is empty or damaged"), 3);
}

}  // namespace
}  // namespace corvane::test
