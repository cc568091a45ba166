#include <corvane/Upload/RetryAfter.h>
#include <corvane/Upload/UploadDropbox.h>
#include <corvane/Upload/UploadManager.h>
#include <corvane/Upload/UploadRequest.h>
#include <corvane/Upload/gzip.h>

#include "tests/support/FakeUploadService.h"
#include "tests/support/PassTime.h"
#include "tests/support/Testing.h"
#include "tests/support/TextResource.h"

namespace corvane::test {
namespace {

/// What one run of a process has: a manager over the files that earlier runs left.
struct ProcessRun {
    explicit ProcessRun(std::optional<std::string> location = "main",
                        std::optional<std::chrono::milliseconds> retryDelay = {})
        : store(std::make_shared<DeferredStore<SignedEntity>>(std::move(location))),
          manager(corvane::UploadManager::create(service, store, dropbox, ledger, nullptr, retryDelay)) {
        if (!retryDelay) return;
        manager->registerAccessQueue(accessQueue);
        manager->open();
    }
    ~ProcessRun() {
        manager.reset();
        store.reset();
        DeferredStoreCore::queue().sync([] {});
    }

    UploadTaken upload(const std::string& identifier) {
        ledger->add(identifier, 10);
        return manager->upload(
            {{"com.example.player", "Player", "2.3", 117}, std::make_shared<TextResource>(identifier)});
    }
    /// Lets time pass, and returns what is sent again then.
    std::vector<std::string> pass(std::chrono::seconds time) {
        passTime(*accessQueue, time);
        passTime(*accessQueue);  // a portion is behind what waits
        manager->open();
        const auto all = resubmitted();
        return {all.begin() + std::exchange(seen, std::ssize(all)), all.end()};
    }
    void retry(const std::string& identifier, std::optional<std::chrono::seconds> serverDelay = {},
               DeliveryUpdate::Reason reason = DeliveryUpdate::Reason::answer) {
        service->complete(UploadResult::retry(identifier, now(), true, {.reason = reason}, serverDelay));
    }
    [[nodiscard]] std::vector<SignedEntity> rows() const {
        return store->perform([](Store<SignedEntity>& rows) { return rows.fetchAll(); });
    }
    void insert(const SignedEntity& entity) const {
        store->perform([&](Store<SignedEntity>& rows) {
            rows.createTable();
            rows.insert(entity);
        });
    }
    [[nodiscard]] std::vector<std::string> resubmitted() const {
        std::vector<std::string> identifiers;
        for (const auto& list : service->resubmitted) {
            for (const auto& request : list) identifiers.push_back(request.identifier);
        }
        return identifiers;
    }

    std::ptrdiff_t seen = 0;  // of what was sent again
    std::shared_ptr<SerialQueue> accessQueue = std::make_shared<SerialQueue>("test");
    std::shared_ptr<FakeUploadService> service = std::make_shared<FakeUploadService>();
    std::shared_ptr<UploadDropbox> dropbox = std::make_shared<UploadDropbox>("main");
    std::shared_ptr<DeliveryLedger> ledger = std::make_shared<DeliveryLedger>();
    std::shared_ptr<DeferredStore<SignedEntity>> store;
    std::shared_ptr<corvane::UploadManager> manager;
};

SignedEntity row(std::string identifier, std::int64_t retries) {
    return {.identifier = std::move(identifier), .contentType = "c", .userAgent = "u", .retries = retries};
}

class UploadManager : public ::testing::Test {
  protected:
    const TemporaryDocuments documents;
    const CapturedLog log;
};

TEST_F(UploadManager, DocumentsThatEndTogetherGoTogether) {
    ProcessRun run;
    run.manager->open();
    const std::vector<UploadResult> results{UploadResult::success("1", {200}), UploadResult::retry("2", now()),
                                            UploadResult::failed("3", {404})};
    for (const auto* identifier : {"1", "2", "3"}) run.upload(identifier);
    StoreConnection other(StoreLocation::default_("main"));
    other.run(
        "CREATE TRIGGER full BEFORE DELETE ON signed_requests WHEN OLD.identifier = '3' "
        "BEGIN SELECT RAISE(FAIL, 'full'); END;");
    run.manager->uploadServiceTogether(*run.service, results);
    EXPECT_EQ(run.rows().size(), 3u) << "all or none";
    for (const auto* identifier : {"1", "2", "3"}) EXPECT_TRUE(run.dropbox->existingFile(identifier));
    EXPECT_EQ(log.count("Completed upload but failed to cleanup tracking data"), 2);
    other.run("DROP TRIGGER full;");
    run.manager->uploadServiceTogether(*run.service, results);
    ASSERT_EQ(run.rows().size(), 1u);
    EXPECT_EQ(run.rows().at(0).identifier + std::to_string(run.rows().at(0).retries), "22");
    for (const auto* identifier : {"1", "3"}) EXPECT_FALSE(run.dropbox->existingFile(identifier));
    EXPECT_EQ(run.ledger->report(), (DeliveryReport{.delivered = {10, 1}, .pending = {10, 1}, .givenUp = {10, 1}}));
}

TEST_F(UploadManager, WhatEndedElsewhereIsWaitedForNoLongerAndLeftToWhoeverWasTold) {
    ProcessRun run;
    run.manager->open();
    for (const auto* identifier : {"delivered", "refused", "to be sent again"}) run.upload(identifier);
    run.ledger->add("without a row", 10);
    run.manager->uploadEndedElsewhere(UploadResult::success("delivered", {200}));
    run.manager->uploadEndedElsewhere(UploadResult::failed("refused", {404}));
    run.manager->uploadEndedElsewhere(UploadResult::retry("to be sent again", now()));
    run.manager->uploadEndedElsewhere(UploadResult::retry("without a row", now()));
    EXPECT_EQ(run.ledger->wait(std::chrono::steady_clock::now()),
              (DeliveryReport{.delivered = {10, 1}, .pending = {10, 1}, .givenUp = {20, 2}}));
    EXPECT_EQ(run.rows().size(), 3u);
    for (const auto& stored : run.rows()) {
        EXPECT_EQ(stored.retries, 0) << "it is counted there";
        EXPECT_TRUE(run.dropbox->existingFile(stored.identifier));
    }
}

// The others were another process's, which had begun the epoch before this one heard of it.
TEST_F(UploadManager, ForgetsTheDocumentsThatHaveLostTheirRows) {
    ProcessRun run("main", 1s);
    for (const auto* identifier : {"old", "new", "later"}) run.upload(identifier);
    run.retry("later");
    StoreConnection(StoreLocation::default_("main")).run("DELETE FROM signed_requests WHERE identifier = 'old';");
    run.manager->forget();
    EXPECT_FALSE(run.dropbox->existingFile("old"));
    EXPECT_TRUE(run.dropbox->existingFile("new"));
    EXPECT_EQ(run.service->cancelled, (std::vector<std::set<std::string>>{{"old"}}));
    EXPECT_EQ(run.ledger->report(), (DeliveryReport{.delivered = {}, .pending = {20, 2}, .givenUp = {10, 1}}));
    EXPECT_EQ(run.pass(2s), (std::vector<std::string>{"later"}));
}

TEST_F(UploadManager, ARetrysWholeLife) {
    const Date later = now() + std::chrono::hours(1);
    // 1. The first attempt does not get through: the row counts it, the payload stays, and nothing more happens in
    //    this run, even when the manager is opened again.
    {
        ProcessRun run;
        run.manager->open();
        run.upload("I");
        run.service->complete(UploadResult::retry("I", later));
        run.service->complete(UploadResult::retry("I", later, false));  // nothing was sent
        EXPECT_EQ(run.rows().at(0).retries, 1);
        EXPECT_LT(std::chrono::abs(run.rows().at(0).retryAfterDate - later), std::chrono::milliseconds(1));
        EXPECT_EQ(run.ledger->report().pending, (DeliveryReport::Count{10, 1}));
        run.manager->close();
        run.manager->open();
        EXPECT_TRUE(run.resubmitted().empty());
    }
    // 2. The next four runs send it again, whatever its date, and do not get through either.
    for (int retries = 2; retries <= 5; ++retries) {
        ProcessRun run;
        run.manager->open();
        EXPECT_EQ(run.resubmitted(), std::vector<std::string>{"I"});
        run.service->complete(UploadResult::retry("I", later));
        EXPECT_EQ(run.rows().at(0).retries, retries);
        EXPECT_EQ(run.ledger->report().pending, (DeliveryReport::Count{0, 1}));
    }
    // 3. The run after that gives it up, row and payload.
    ProcessRun run;
    run.manager->open();
    EXPECT_TRUE(run.resubmitted().empty());
    EXPECT_TRUE(run.rows().empty());
    EXPECT_EQ(run.dropbox->existingFile("I"), std::nullopt);
    EXPECT_EQ(run.ledger->report().givenUp, (DeliveryReport::Count{0, 1}));
    EXPECT_EQ(log.count("Retry dropped for exceeding allowed attempts, identifier=I"), 1);
    // 4. A late answer to the last attempt changes nothing.
    run.service->complete(UploadResult::retry("I", later));
    EXPECT_TRUE(run.rows().empty());
}

TEST_F(UploadManager, SendsWhatIsStoredAPortionAtATimeAndEachOnce) {
    ProcessRun run;
    const auto name = [](std::size_t i) { return "I" + std::to_string(i); };
    const std::size_t all = 3 * Backlog::portion;
    std::vector<std::string> sent;
    for (std::size_t i = 0; i < all; ++i) {
        run.insert(row(name(i), i % 7 ? 0 : 9));  // every seventh is dropped
        run.dropbox->write(name(i), gzipCompressed("x"), TextResource(name(i)));
        if (i % 7 && i + 1 != all) sent.push_back(name(i));
    }
    run.manager->open();
    run.manager->open();  // what the first has left to its queue is done
    EXPECT_LE(run.resubmitted().size(), 2 * Backlog::portion);
    EXPECT_EQ(run.ledger->report().pending.documents + run.ledger->report().givenUp.documents, all);
    // One ends before its turn, as an earlier run's transfer may, and some while their portion is under way.
    run.service->complete(UploadResult::success(name(all - 1), {200}));
    for (std::size_t ended = 0; ended < run.resubmitted().size(); ++ended) {
        run.service->complete(UploadResult::success(run.resubmitted()[ended], {200}));
        run.manager->open();
        EXPECT_LE(run.resubmitted().size() - ended, 2 * Backlog::portion);
    }
    EXPECT_EQ(run.resubmitted(), sent);
    EXPECT_EQ(run.ledger->report(), (DeliveryReport{{0, std::ssize(sent) + 1}, {}, {0, 14}}));
    EXPECT_TRUE(run.rows().empty());
    EXPECT_EQ(log.count("Failed"), 0);
}

// The first delay is 100 s, and up to a quarter more.
TEST_F(UploadManager, SendsAgainInTheSameRunWithGrowingDelays) {
    using Names = std::vector<std::string>;
    ProcessRun run("main", 100s);
    for (const auto* name : {"I", "J"}) run.upload(name);
    run.service->complete(UploadResult::retry("I", now(), false));  // nothing was sent
    EXPECT_EQ(run.pass(99s), Names{});
    run.retry("J");
    EXPECT_EQ(run.pass(27s), (Names{"I", "J"})) << "with the first that failed";
    EXPECT_TRUE(run.ledger->isSettled()) << "nobody waits for it again";
    EXPECT_EQ(run.pass(1h), Names{}) << "one pass at a time";
    for (const auto* name : {"I", "J"}) run.retry(name);
    for (const auto& row : run.rows()) EXPECT_EQ(row.retries, 1) << "once for a run";

    EXPECT_EQ(run.pass(199s), Names{});
    EXPECT_EQ(run.pass(52s), (Names{"I", "J"}));
    run.manager->close();
    run.service->complete(UploadResult::success("I", {200}));
    run.retry("J");
    EXPECT_EQ(run.ledger->report(), (DeliveryReport{{10, 1}, {10, 1}, {}})) << "each counts once";
    EXPECT_EQ(run.pass(126s), Names{"J"}) << "something got through";
    run.retry("J", 3600s);
    EXPECT_EQ(run.pass(3599s), Names{}) << "the server has asked for it";
    EXPECT_EQ(run.pass(902s), Names{"J"});
    for (int i = 0; i < 8; ++i, run.pass(4501s)) run.retry("J");
    run.upload("K");
    run.service->complete(UploadResult::success("K", {200}));
    run.retry("J");
    EXPECT_EQ(run.pass(126s), Names{"J"}) << "the server is there again";
    run.retry("J");
    run.upload("L");
    run.service->complete(UploadResult::success("L", {200}));
    EXPECT_EQ(run.pass(126s), Names{"J"});
    run.manager->uploadEndedElsewhere(UploadResult::success("J", {200}));
    EXPECT_EQ(run.ledger->report(), (DeliveryReport{{40, 4}, {}, {}}));
    EXPECT_EQ(run.pass(5h), Names{});
}

TEST_F(UploadManager, GivesNothingUpHoweverOftenItIsSentAgainInOneRun) {
    ProcessRun run("main", 1s);
    run.insert(row("I", StoredUploads::maximumRetries));
    run.dropbox->write("I", gzipCompressed("x"), TextResource("I"));
    for (const auto* name : {"I", "another's", "no payload"}) run.ledger->add(name, 1);
    for (const auto* name : {"no payload", "another's"}) run.insert(row(name, 0));
    for (const auto* name : {"I", "another's"}) run.retry(name, {}, DeliveryUpdate::Reason::unreachable);
    run.retry("no payload");
    run.store->perform([](Store<SignedEntity>& rows) { rows.deleteWhere("identifier", "another's"); });
    for (int i = 0; i < UploadRetries::maximumAttempts + 9; ++i) {
        ASSERT_EQ(run.pass(2h), std::vector<std::string>{"I"}) << i;
        run.retry("I", {}, i < 10 ? DeliveryUpdate::Reason::blocked : DeliveryUpdate::Reason::answer);
    }
    ASSERT_EQ(run.pass(2h).size(), 1u);
    run.retry("I");
    EXPECT_EQ(run.pass(2h), std::vector<std::string>{});
    ASSERT_EQ(run.rows().size(), 1u);
    EXPECT_EQ(run.rows().at(0).retries, StoredUploads::maximumRetries + 1);
    EXPECT_EQ(log.count("Upload waits for the next run after 100 attempts, identifier=I"), 1);
    EXPECT_EQ(run.ledger->report(), (DeliveryReport{{}, {1, 1}, {1, 1}}));
}

TEST_F(UploadManager, APassThatIsInVainSendsNoMore) {
    const std::size_t all = 3 * Backlog::portion;
    for (const bool isHeld : {false, true}) {
        ProcessRun run("main", 1s);
        for (std::size_t i = 0; i < all; ++i) run.upload(std::to_string(i));
        for (std::size_t i = 0; i < all; ++i) run.retry(std::to_string(i));
        auto sent = run.pass(2s);
        EXPECT_EQ(sent.size(), Backlog::portion);
        for (std::size_t i = 0; i < sent.size(); ++i) {
            run.retry(sent[i], isHeld && i == 0 ? std::optional(1s) : std::nullopt);
            if (!isHeld || i > 0) continue;
            EXPECT_EQ(run.pass(0s).size(), 0u);
        }
        // The others come first, and all of them when something gets through.
        std::set<std::string> later;
        for (sent = run.pass(1h); !sent.empty(); sent = run.pass(0s)) {
            EXPECT_LE(sent.size(), Backlog::portion);
            for (const auto& one : sent) {
                later.insert(one);
                run.service->complete(UploadResult::success(one, {200}));
            }
        }
        EXPECT_EQ(later.size(), all);
        EXPECT_EQ(run.ledger->report(), (DeliveryReport{{10 * std::ssize(later), std::ssize(later)}, {}, {}}));
    }
}

TEST(RetryAfter, IsANumberOfSecondsOrADateAndNeverLong) {
    const Date date = *dateFromSeconds(784111777);
    const struct {
        const char* text;
        std::optional<std::int64_t> seconds;
    } cases[] = {
        {"0", 0},
        {"99999999999999999999999", 86400},
        {"Sun, 06 Nov 1994 08:50:37 GMT", 60},
        {"Sunday, 06-Nov-94 08:50:37 GMT", 60},
        {"Sun Nov  6 08:50:37 1994", 60},
        {"Fri, 31 Dec 9999 23:59:59 GMT", 86400},
        {"Sun, 06 Nov 1994 08:49:37 GMT", {}},
        {"", {}},
        {"-5", {}},
        {"soon", {}},
    };
    for (const auto& [text, seconds] : cases) {
        const auto found = retryAfter({503, {{"retry-after", text}}}, date);
        EXPECT_EQ(found ? std::optional(found->count()) : std::nullopt, seconds) << text;
        EXPECT_EQ(retryAfter({429, {{"Retry-After", text}}}, date), found) << text;
        for (const int status : {200, 401, 500}) EXPECT_FALSE(retryAfter({status, {{"Retry-After", text}}}, date));
    }
}

TEST_F(UploadManager, RemovesOldPayloadsThatNobodyHas) {
    ProcessRun run;
    const std::string name = "00000000-0000-4000-8000-00000000000";
    const auto payload = [&](char last, bool isOld) {
        const auto file = run.dropbox->write(name + last, "x", TextResource(name + last));
        if (isOld) std::filesystem::last_write_time(file, std::filesystem::file_time_type::clock::now() - 2h);
    };
    for (const char last : {'1', '2', '3'}) payload(last, true);
    payload('4', false);
    writeFile(run.dropbox->baseURL() / "a user's", "x");
    std::filesystem::last_write_time(run.dropbox->baseURL() / "a user's", std::filesystem::file_time_type());
    run.insert(row(name + "2", 0));
    run.service->running = {name + "3"};
    {
        ProcessRun inMemory(std::nullopt);  // knows of no rows
        inMemory.manager->open();
    }
    EXPECT_NE(run.dropbox->existingFile(name + "1"), std::nullopt);
    run.manager->open();
    EXPECT_EQ(run.dropbox->existingFile(name + "1"), std::nullopt);
    EXPECT_EQ(log.count("Payload without a row was removed"), 1);
}

TEST(GZIP, LeavesNothingAndWhatIsCompressedAsItIs) {
    for (const auto& bytes : {std::string(), gzipCompressed("x")}) EXPECT_EQ(gzipCompressed(bytes), bytes);
}

TEST_F(UploadManager, RefusesWhatItCannotWriteAndLeavesNoRow) {
    ProcessRun run;
    run.manager->open();
    const auto upload = [&](const std::string& identifier, const std::string& text, const std::string& type = "t") {
        run.manager->upload({{"a", "b", "1", 1}, std::make_shared<TextResource>(identifier, text, type)});
    };
    EXPECT_THROW(upload("I", "\"not an object\""), JSONError);
    for (const char* type : {"a\rb", "a\nX-Y: b"}) EXPECT_THROW(upload("I", "{}", type), InvalidArgument);
    EXPECT_TRUE(run.rows().empty());
    EXPECT_TRUE(run.service->submitted.empty());
}

}  // namespace
}  // namespace corvane::test
