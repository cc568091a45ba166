#include <corvane/Agent/Daemon/UploadQueue.h>
#include <corvane/Transfer/TransferError.h>

#include "tests/support/TLSServer.h"
#include "tests/support/Testing.h"

namespace corvane::test {
namespace {

using namespace transferd;
using Reply = ScriptedServer::Reply;
using Numbers = std::vector<std::int64_t>;

constexpr const char* nowhere = "http://127.0.0.1:1/";

// The source of the queue's transfers; the time of the delays is what the test says.
class UploadQueueTest : public testing::Test, public UploadQueue::Source {
  protected:
    UploadQueueTest() { writeFile(documents / "body", "b"); }

    std::optional<HTTPTransfer> transfer(std::int64_t number) override {
        started.push_back(number);
        HTTPTransfer made;
        made.request.url = urls[number];
        made.bodyPath = documents / "body";
        made.trustedCertificates = trusted[number];
        return made;
    }
    bool mayWait(std::int64_t) override { return isPatient; }
    void troubleChanged(const UploadQueue::Trouble& trouble, const Numbers& uploads) override {
        const std::string kind = trouble.isBlocked ? "blocked " : "unreachable ";
        troubles += trouble.lasts ? kind + std::to_string(uploads.size()) + ";" : "over;";
    }
    void add(std::int64_t number, const std::string& url, int perHost = 4) {
        TransferSubmission submission;
        submission.request.url = urls[number] = url;
        submission.limits.transfersPerHost = perHost;
        submission.trustedCertificates = trusted[number].string();
        queue.add(number, submission);
    }
    /// Lets the queue work until so many uploads have started and ended, all in one moment of the test's time.
    [[nodiscard]] bool work(std::size_t starts, std::size_t ends) {
        const auto deadline = std::chrono::steady_clock::now() + 20s;
        do {
            queue.proceed(now);
            for (const auto& one : queue.ended()) {
                const auto& error = one.outcome.error;
                ended[one.number] = error ? error->as<TransferError>()->code() : int(one.outcome.response->statusCode);
            }
            queue.ended().clear();
            const bool rests =
                isHeld ? server.requests().size() == started.size() : queue.isEmpty() || queue.isStalled(now);
            if (started.size() == starts && ended.size() == ends && rests) return true;
            queue.wait({}, 20);
        } while (std::chrono::steady_clock::now() < deadline);
        return false;
    }
    TemporaryDocuments documents;
    ScriptedServer server;
    UploadQueue::Clock::time_point now{1h};
    UploadQueue queue{*this, 20ms};
    std::map<std::int64_t, std::string> urls;
    std::map<std::int64_t, std::filesystem::path> trusted;
    bool isPatient = true, isHeld = false;
    Numbers started;
    std::map<std::int64_t, int> ended;  // with the status, or the code of the error
    std::string troubles;
};

TEST_F(UploadQueueTest, RunsSoManyAtOnceToAHostAndABadDocumentHoldsUpNoOther) {
    std::string head = "HTTP/1.1 200 OK\r\nContent-Length: 0\r\n";
    for (int i = 0; head.size() < 250'000; ++i) head += std::to_string(i) + ":\r\n";
    server.script(Reply::raw("").hold(), 2);
    server.script(Reply::raw(head + "\r\n"));
    isHeld = true;
    for (const int number : {1, 2, 3, 4}) add(number, server.url(), 2);
    ASSERT_TRUE(work(2, 0)) << "the others wait";
    isHeld = false;
    server.release(2);
    ASSERT_TRUE(work(4, 4));
    const int broken = static_cast<int>(TransferError::Code::network);
    EXPECT_EQ(ended, (std::map<std::int64_t, int>{{1, broken}, {2, broken}, {3, 200}, {4, 200}}));
    EXPECT_TRUE(queue.isEmpty() && troubles.empty());
}

TEST_F(UploadQueueTest, LeavesAServerAloneForGrowingDelaysAndTriesEachUploadInItsTurn) {
    for (const int number : {1, 2, 3}) add(number, nowhere);
    ASSERT_TRUE(work(3, 0));
    EXPECT_EQ(troubles, "unreachable 3;");
    EXPECT_TRUE(queue.isHopeless());
    for (const auto delay : {20ms, 40ms, 80ms}) {
        const auto before = started.size();
        now += delay - 1ms;
        ASSERT_TRUE(work(before, 0)) << "too early";
        now += 1ms;
        ASSERT_TRUE(work(before + 1, 0)) << "one speaks for all";
    }
    EXPECT_EQ(std::set(started.end() - 3, started.end()).size(), 3u) << "each in its turn";
    EXPECT_EQ(troubles, "unreachable 3;");
    for (const int number : {1, 2, 3}) urls[number] = server.url();
    now += 160ms;
    ASSERT_TRUE(work(9, 3));
    EXPECT_EQ(ended, (std::map<std::int64_t, int>{{1, 200}, {2, 200}, {3, 200}}));
    EXPECT_EQ(troubles, "unreachable 3;over;");

    isPatient = false;
    for (const int number : {4, 5}) add(number, nowhere, 1);
    ASSERT_TRUE(work(10, 5)) << "one failure ends those that have waited long enough, too";
    EXPECT_EQ(ended[4] * ended[5], 16) << "unreachable";
    EXPECT_TRUE(queue.isEmpty());
}

TEST_F(UploadQueueTest, ABlockedWayIsThatOfItsTrustAloneAndIsTroubleOfItsOwn) {
    const TLSServer secure;
    trusted[1] = trusted[2] = documents / "body";  // no certificate
    writeFile(trusted[3] = documents / "right", secure.certificate());
    add(1, secure.url());
    ASSERT_TRUE(work(1, 0));
    EXPECT_EQ(troubles, "blocked 1;");
    add(3, secure.url());
    ASSERT_TRUE(work(2, 1));
    EXPECT_EQ(ended[3], 200);
    add(2, secure.url());
    EXPECT_EQ(troubles, "blocked 1;blocked 1;") << "of whoever comes later";
    urls[1] = nowhere;
    now += 20ms;
    ASSERT_TRUE(work(3, 1));
    EXPECT_EQ(troubles, "blocked 1;blocked 1;unreachable 2;");
    queue.remove(1);
    queue.remove(2);
    EXPECT_TRUE(queue.isEmpty());
}

}  // namespace
}  // namespace corvane::test
