#include <corvane/Testing/FakeTransferSession.h>
#include <corvane/Testing/ProcessSettings.h>
#include <corvane/Testing/RecordingProcessor.h>

#include "tests/Integration/FaultFixture.h"

#include <corvane/Upload/UploadManager.h>

#include <algorithm>
#include <deque>
#include <mutex>

namespace corvane::test {
namespace {

using Code = TransferError::Code;
using Lines = std::vector<std::string>;
using Outcome = FakeTransferSession::Outcome;

constexpr const char* url = "https://collector.example.com/in";

/// Transfers that end when the test says so, and a main queue that runs when the test says so.
class Observer : public ::testing::Test, protected FaultFixture {
  protected:
    Observer() {
        settings.setTransfers(FakeTransferSession::factory(session));
        settings.setMainQueue([this](std::function<void()> task) {
            const std::lock_guard lock(mutex);
            loop.push_back(std::move(task));
        });
    }
    std::size_t posted() {
        settled->settle();
        const std::lock_guard lock(mutex);
        return loop.size();
    }
    /// Runs what is posted; what was heard by then.
    Lines hear() {
        while (posted() > 0) {
            std::unique_lock lock(mutex);
            const auto task = std::move(loop.front());
            loop.pop_front();
            lock.unlock();
            task();
        }
        return std::exchange(heard, {});
    }
    /// Writes down what it is told, documents by the number of their task.
    DeliveryObserver recorder() {
        return [this](const DeliveryUpdate& update) { heard.push_back(text(update)); };
    }
    /// How many transfers there are once what was submitted is processed.
    [[nodiscard]] std::size_t tasks() {
        settled->settle();
        return session->made().size();
    }
    [[nodiscard]] std::string text(const DeliveryUpdate& update) const {
        constexpr const char* steps[] = {"under way", "progress", "delivered", "deferred", "given up"};
        constexpr const char* reasons[] = {"", "answer", "unreachable", "blocked", "failed", "attempts", "payload"};
        std::string line = steps[static_cast<int>(update.step)];
        for (const auto& task : session->made()) {
            if (task->description() == update.document) line += ' ' + std::to_string(task->identifier());
        }
        const auto& [reason, status, problem] = update.cause;
        if (update.events) line += " of " + std::to_string(*update.events);
        if (reason != DeliveryUpdate::Reason::none) line += std::string(": ") + reasons[static_cast<int>(reason)];
        if (status) line += ' ' + std::to_string(*status);
        if (!problem.empty()) line += ' ' + problem;
        if (update.bytesExpected == 0) return line;
        return line + ' ' + std::to_string(update.bytesSent) + '/' + std::to_string(update.bytesExpected);
    }

    std::shared_ptr<FakeTransferSession> session;
    std::shared_ptr<RecordingProcessor> settled = std::make_shared<RecordingProcessor>();  // knows when all has run
    std::mutex mutex;
    std::deque<std::function<void()>> loop;
    Lines heard;
    ProcessSettings settings;
};

TEST_F(Observer, HearsOfEachDocumentInOrderOnTheMainQueueUntilItIsRemoved) {
    Application application(url, 2);
    application.sessions.processorManager()->add(settled);
    application.submit(4);
    ASSERT_EQ(tasks(), 2u);
    session->complete(1, 200);
    EXPECT_EQ(posted(), 0u) << "there is no observer";

    application.uploads->setDeliveryObserver(recorder());
    application.submit(6);
    ASSERT_EQ(tasks(), 5u);
    for (const int sent : {10, 20}) session->progress(2, sent, 30);
    session->progress(3, 5, 30);
    session->progress(2, 30, 30);
    session->complete(2, 200);
    session->complete(3, 503);
    session->complete(4, Outcome::failure(Code::blocked, "no trust"));
    session->complete(5, Outcome{AnyError(TransferError(Code::network, "cut")), TransferResponse{true, 200, {}}});
    EXPECT_TRUE(posted() > 0 && heard.empty()) << "not inside a call";
    EXPECT_EQ(hear(), (Lines{"under way 3 of 2", "under way 4 of 2", "under way 5 of 2", "progress 2 of 2 30/30",
                             "progress 3 of 2 5/30", "delivered 2 of 2: answer 200", "deferred 3 of 2: answer 503",
                             "deferred 4 of 2: blocked no trust", "deferred 5 of 2: failed 200 cut"}));

    application.submit(2);
    ASSERT_EQ(tasks(), 6u);
    EXPECT_GT(posted(), 0u);
    application.uploads->setDeliveryObserver([record = recorder(), &application](const DeliveryUpdate& update) {
        record(update);
        if (update.step == DeliveryUpdate::Step::givenUp) application.uploads->setDeliveryObserver({});
        throw std::runtime_error("the host's");
    });
    application.submit(2);
    ASSERT_EQ(tasks(), 7u);
    session->complete(6, 404);
    session->complete(7, 200);
    EXPECT_EQ(hear(), (Lines{"under way 7 of 2", "given up 6 of 2: answer 404"}));
    EXPECT_EQ(log.count("Host code failed, call=delivery observer, error=the host's"), 2);
    application.submit(2);
    ASSERT_EQ(tasks(), 8u);
    EXPECT_EQ(posted(), 0u) << "it has removed itself";
}

TEST_F(Observer, HearsOfWhatEarlierRunsHaveLeft) {
    {
        Application application(url, 1);
        application.sessions.processorManager()->add(settled);
        application.submit(3);
        ASSERT_EQ(tasks(), 3u);
        for (const int task : {1, 2, 3}) session->complete(task, 503);
        application.abandon();
    }
    settled = std::make_shared<RecordingProcessor>();
    auto left = rows();
    std::filesystem::remove(dropbox() / left.at(0).identifier);
    left.at(1).retries = StoredUploads::maximumRetries + 1;
    Store<SignedEntity>(StoreLocation::default_("main")).insert(left.at(1));
    Application application(url, 1, "main", recorder());
    application.sessions.processorManager()->add(settled);
    settled->settle();
    ASSERT_TRUE(session->waitForTasks(1));
    auto lines = hear();
    std::sort(lines.begin(), lines.end());
    EXPECT_EQ(lines, (Lines{"given up: attempts", "given up: payload", "under way 1"}));
    session->complete(1, 200);
    EXPECT_EQ(hear(), Lines{"delivered 1: answer 200"});
}

TEST_F(Observer, FlushSendsTheOpenBatchOfTheSessionAloneAndTheSessionGoesOn) {
    UploadBatchEventProcessor unused(Client{"com.example.player", "Player", "2.3", 117}, Endpoint{url, "unused"});
    unused.flush();
    Application application(url);
    application.sessions.processorManager()->add(settled);
    application.uploads->flush();
    const auto menu = application.sessions.tracker()->chain("menu");
    menu->enterGroup("menu");
    menu->submit<ScreenView>();
    application.submit(3);
    application.uploads->flush();
    application.uploads->flush();
    application.submit();
    ASSERT_EQ(tasks(), 1u);
    session->complete(1, 200);
    EXPECT_EQ(application.wait(), (DeliveryReport{{3, 1}, {}, {}})) << "the fourth is in the next batch";

    application.uploads->flush();
    menu->leaveGroup();
    ASSERT_EQ(tasks(), 3u);
    session->complete(2, Outcome::failure(Code::unreachable));
    const auto report = application.uploads->waitForDelivery(std::chrono::steady_clock::now() + std::chrono::hours(1),
                                                             {.onlyWhileReachable = true});
    EXPECT_EQ(report, (DeliveryReport{{3, 1}, {2, 2}, {}})) << "the third was not waited for";
    session->complete(3, 200);
    application.sessions.endSync();
    application.uploads->flush();
    EXPECT_EQ(tasks(), 3u);
    EXPECT_EQ(log.count("Attempting to perform upload"), 0);
}

}  // namespace
}  // namespace corvane::test
