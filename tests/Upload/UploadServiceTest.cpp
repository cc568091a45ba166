#include <corvane/Upload/UploadService.h>

#include <corvane/Platform/MainQueue.h>
#include <corvane/Transfer/TransferError.h>
#include <corvane/Upload/PreparedUploadRequest.h>
#include <corvane/Upload/UploadServiceDelegate.h>

#include "tests/support/CapturedLog.h"
#include "tests/support/FakeTransferSession.h"
#include "tests/support/ProcessSettings.h"
#include "tests/support/ScriptedServer.h"
#include "tests/support/TemporaryDocuments.h"

#include <gtest/gtest.h>

#include <chrono>
#include <condition_variable>
#include <future>
#include <mutex>
#include <stdexcept>
#include <string>
#include <vector>

namespace corvane {
namespace {

using test::FakeTransferSession;
using State = TransferTask::State;
using Verdict = UploadService::Verdict;

struct TestSigner final : SignerType {
    std::string sign(std::string_view body) override {
        if (body == "unsignable") throw std::runtime_error("no\r\nkey: 1");
        return "signed " + std::string(body);
    }
};

class Books final : public UploadServiceDelegate {
  public:
    void uploadService(UploadServiceType&, const UploadResult& result) override {
        std::lock_guard lock(mutex_);
        results_.push_back(describe(result));
        changed_.notify_all();
    }
    std::vector<std::string> wait(std::size_t count) {
        std::unique_lock lock(mutex_);
        EXPECT_TRUE(changed_.wait_for(lock, std::chrono::seconds(10), [&] { return results_.size() >= count; }));
        return results_;
    }

  private:
    static std::string describe(const UploadResult& result) {
        if (const auto* success = std::get_if<UploadResult::Success>(&result.value)) {
            return "success " + success->identifier + ' ' + success->response.description();
        }
        if (const auto* failed = std::get_if<UploadResult::Failed>(&result.value)) {
            return "failed " + failed->identifier + ' ' + std::to_string(failed->response.statusCode);
        }
        const auto& retry = std::get<UploadResult::Retry>(result.value);
        EXPECT_LT(std::chrono::abs(now() - retry.after), std::chrono::seconds(10));
        return (retry.isCounted ? "retry " : "uncounted ") + retry.identifier;
    }

    std::mutex mutex_;
    std::condition_variable changed_;
    std::vector<std::string> results_;
};

class UploadServiceTest : public testing::Test {
  protected:
    UploadServiceTest() {
        service->setDelegate(books);
        service->registerAccessQueue(queue);
    }
    PreparedUploadRequest request(const std::string& identifier, std::string_view contents = "body") {
        test::writeFile(documents / identifier, contents);
        return {identifier, "text/x; version=1", "me/1", documents / identifier};
    }

    test::CapturedLog log;
    test::TemporaryDocuments documents;
    FakeTransferSession::Shelf shelf;
    std::shared_ptr<SerialQueue> queue = std::make_shared<SerialQueue>("test");
    std::shared_ptr<Books> books = std::make_shared<Books>();
    std::shared_ptr<UploadService> service =
        std::make_shared<UploadService>(Endpoint("https://collector.example.com/in", "Main", "group.x"),
                                        std::make_shared<TestSigner>(), shelf.factory());
};

TEST(UploadServiceClassification, ReadsEveryStatusCode) {
    const struct {
        std::int64_t first, last;
        Verdict verdict;
    } ranges[] = {
        {-1, 199, Verdict::unhandled},    {200, 299, Verdict::delivered},    {300, 399, Verdict::unhandled},
        {400, 400, Verdict::refused},     {401, 401, Verdict::unauthorized}, {402, 428, Verdict::refused},
        {429, 429, Verdict::unavailable}, {430, 499, Verdict::refused},      {500, 1000, Verdict::unavailable}};
    for (const auto& range : ranges) {
        for (auto code = range.first; code <= range.last; ++code) {
            EXPECT_EQ(UploadService::classify(code), range.verdict) << code;
        }
    }
}

TEST_F(UploadServiceTest, OpensItsSessionOnFirstUseAndSubmits) {
    EXPECT_EQ(shelf.count(), 0u);
    service->submit(request("A"));
    service->submit(request("B", "unsignable"));
    service->submit({"C", "text/x\r\nEvil: 1", "me/1", documents / "missing"});
    const auto session = shelf.only();
    ASSERT_TRUE(session);
    const auto& configuration = session->configuration();
    EXPECT_EQ(configuration.identifier, "com.veskar.corvane.upload-session");
    EXPECT_EQ(session->description(), "com.veskar.corvane.upload-session");
    EXPECT_EQ(configuration.sharedContainerIdentifier, "group.x");
    EXPECT_TRUE(configuration.discretionary && configuration.relaunchesForEvents);
    EXPECT_EQ(configuration.ownerKey, UploadService::ownerKey(Endpoint("https://other.example.com", " main ")));
    EXPECT_NE(configuration.ownerKey, UploadService::ownerKey(Endpoint("https://other.example.com", "second")));

    const auto uploads = session->uploads();
    ASSERT_EQ(uploads.size(), 3u);
    EXPECT_EQ(uploads[0].description, "A");
    EXPECT_EQ(uploads[0].state, State::running);
    EXPECT_EQ(uploads[0].file, documents / "A");
    const TransferRequest expected{.url = "https://collector.example.com/in",
                                   .method = "PUT",
                                   .headers = {{"Content-Type", "text/x; version=1"},
                                               {"User-Agent", "me/1"},
                                               {"Content-Encoding", "gzip"},
                                               {"X-Veskar-ActionSignature", "signed body"}}};
    EXPECT_EQ(uploads[0].request, expected);
    EXPECT_EQ(uploads[1].request.headers[3].second, "SigningFailure=no  key: 1");
    EXPECT_EQ(uploads[2].request.headers[0].second, "text/x  Evil: 1");
    EXPECT_TRUE(uploads[2].request.headers[3].second.starts_with("SigningFailure=cannot read "));
    EXPECT_TRUE(log.has(LogLevel::default_,
                        "Upload task submitted, identifier=A, "
                        "urlSessionTaskID=<com.veskar.corvane.upload-session>.<1>, signature=signed body"));
}

TEST_F(UploadServiceTest, AsksTheHostForItsHeadersAtEachHandOverAndSendsNoneInPlaceOfItsOwn) {
    int asked = 0;
    EndpointOptions options{.trustedCertificates = "/etc/ca.pem"};
    options.headers = [&]() -> HTTPHeaders {
        if (++asked == 3) throw std::runtime_error("no token");
        return {{"Authorization", "Bearer " + std::to_string(asked)},
                {"content-TYPE", "x"},
                {"Host", "elsewhere"},
                {"two words", "x"},
                {"X-Evil", "secret\r\nA: b"},
                {"X-Mine", ""}};
    };
    service = std::make_shared<UploadService>(Endpoint("https://collector.example.com/in", "Main", options),
                                              std::make_shared<TestSigner>(), shelf.factory());
    for (const char* identifier : {"A", "B", "C"}) service->submit(request(identifier));
    const auto uploads = shelf.only()->uploads();
    const auto added = [&](std::size_t upload) {
        const auto& headers = uploads.at(upload).request.headers;
        return HTTPHeaders(headers.begin() + 4, headers.end());
    };
    EXPECT_EQ(shelf.only()->configuration().trustedCertificates, "/etc/ca.pem");
    EXPECT_EQ(added(0), (HTTPHeaders{{"Authorization", "Bearer 1"}, {"X-Mine", ""}}));
    EXPECT_EQ(added(1), (HTTPHeaders{{"Authorization", "Bearer 2"}, {"X-Mine", ""}}));
    EXPECT_EQ(added(2), HTTPHeaders{});
    EXPECT_EQ(log.count("Header of the endpoint is not sent, name="), 8);
    EXPECT_EQ(log.count("Host code failed, call=endpoint headers, error=no token"), 1);
    EXPECT_EQ(log.count("secret") + log.count("Bearer"), 0);
}

TEST_F(UploadServiceTest, ReportsEveryEndingAndLogsIt) {
    const std::string id = "urlSessionTaskID=<com.veskar.corvane.upload-session>.<1>";
    const auto response = [](std::int64_t status) { return UploadResponse{status, {}}.description(); };
    service->submit(request("A"));
    const auto session = shelf.only();
    session->progress(1, 2, 3, 4);
    session->complete(1, AnyError(TransferError(TransferError::Code::network, "no luck")), std::nullopt);
    session->complete(1, AnyError(TransferError(TransferError::Code::blocked, "portal")), std::nullopt);
    session->complete(1, std::nullopt, std::nullopt);
    session->complete(1, std::nullopt, TransferResponse{.isHTTP = false, .statusCode = 200, .headers = {}});
    session->complete(1, 204, {{"A", "b"}});
    session->complete(1, 200, {{"A", "b"}, {"B", "\xff"}});
    session->complete(1, 401);
    session->complete(1, 404);
    session->complete(1, 503);
    session->complete(1, 302);
    queue->sync([] {});
    const std::vector<std::string> expected{"retry A",
                                            "uncounted A",
                                            "retry A",
                                            "retry A",
                                            "success A " + UploadResponse{204, {{"A", "b"}}}.description(),
                                            "success A " + response(200),
                                            "retry A",
                                            "failed A 404",
                                            "retry A",
                                            "failed A 302"};
    EXPECT_EQ(books->wait(expected.size()), expected);
    EXPECT_TRUE(log.has(LogLevel::error, "Upload failed, identifier=A, " + id + ", error=no luck"));
    EXPECT_EQ(log.count("Upload unknown state, identifier=A, " + id), 2);
    for (const std::string& line :
         {"Upload sent data, identifier=A, " + id + ", sent=2, total=3, expected=4",
          "Upload completed successfully, identifier=A, " + id + ", status=200, uploadResponse=" + response(200),
          "Upload HTTP failed authorization, and will retry, identifier=A, " + id +
              ", status=401, uploadResponse=" + response(401),
          "Upload HTTP failed and won't retry, identifier=A, " + id + ", status=404, uploadResponse=" + response(404),
          "Upload HTTP failed, identifier=A, " + id + ", statusCode=503",
          "Upload HTTP failed and unhandled. No retry, identifier=A, " + id +
              ", statusCode=302, uploadResponse=" + response(302)}) {
        EXPECT_TRUE(log.has(LogLevel::default_, line)) << line;
    }
}

TEST_F(UploadServiceTest, ATaskWithoutDescriptionIsUnknownAndAResultWithoutDelegateIsLoggedOnly) {
    EXPECT_FALSE(service->shouldResume("other", [] {}));
    const auto session = shelf.only();
    session->uploadTask({}, {})->resume();
    session->complete(1, 404);
    EXPECT_EQ(books->wait(1), std::vector<std::string>{"failed unknown 404"});
    books.reset();
    session->complete(1, 400);
    EXPECT_TRUE(log.waitFor("status=400"));
}

TEST_F(UploadServiceTest, ResubmitsWhatIsNotRunning) {
    service->resubmit({});
    EXPECT_EQ(shelf.count(), 0u);
    for (const char* identifier : {"running", "suspended", "cancelling", "completed"}) {
        service->submit(request(identifier));
    }
    const auto session = shelf.only();
    session->setState(2, State::suspended);
    session->setState(3, State::cancelling);
    session->complete(4, 503);  // still pending when the listing is asked for
    service->resubmit({request("running"), request("suspended"), request("cancelling"), request("completed")});
    queue->sync([] {});
    std::vector<std::string> again;
    for (const auto& upload : session->uploads()) {
        if (upload.identifier > 4) again.push_back(upload.description.value());
    }
    EXPECT_EQ(again, (std::vector<std::string>{"suspended", "cancelling", "completed"}));
    EXPECT_TRUE(
        log.has(LogLevel::default_, "Resubmission of request cancelled. Already in flight, identifier=running"));
}

TEST_F(UploadServiceTest, CallsTheCompletionsOfAWakeUpOnceInOrderOnTheMainQueue) {
    std::vector<std::function<void()>> mainLoop;
    test::ProcessSettings settings;
    settings.setMainQueue([&](auto task) { mainLoop.push_back(std::move(task)); });
    const std::string identifier(UploadService::sessionIdentifier);
    std::vector<int> called;
    EXPECT_FALSE(service->shouldResume("other", [&] { called.push_back(0); }));
    EXPECT_TRUE(service->shouldResume(identifier, [&]() {
        called.push_back(1);
        throw std::runtime_error("the host's");
    }));
    EXPECT_TRUE(service->shouldResume(identifier, [&] { called.push_back(2); }));
    EXPECT_EQ(shelf.only()->wakeUps(), 2);
    shelf.only()->signalAllEventsDelivered();
    shelf.only()->signalAllEventsDelivered();
    queue->sync([] {});
    EXPECT_TRUE(called.empty());
    ASSERT_EQ(mainLoop.size(), 2u);
    for (auto& task : mainLoop) task();
    EXPECT_EQ(called, (std::vector<int>{1, 2}));
    for (const std::string& line :
         {std::string("Should resume session? identifier=other, result=0, numberOfCompletions=0"),
          "Should resume session? identifier=" + identifier + ", result=1, numberOfCompletions=1",
          "Upload finished for background session, identifier=" + identifier,
          "Upload invoking background completions for session, identifier=" + identifier + ", numberOfCompletions=2"}) {
        EXPECT_TRUE(log.has(LogLevel::default_, line)) << line;
    }

    // Nothing is delivered any more when the service has gone, but nobody is left waiting.
    mainLoop.clear();
    EXPECT_TRUE(service->shouldResume(identifier, [&] { called.push_back(3); }));
    service.reset();
    ASSERT_EQ(mainLoop.size(), 1u);
    mainLoop[0]();
    EXPECT_EQ(called, (std::vector<int>{1, 2, 3}));
}

TEST_F(UploadServiceTest, AFactoryThatFailsIsLoggedAndAskedAgain) {
    int calls = 0;
    service = std::make_shared<UploadService>(
        Endpoint("https://collector.example.com/in", "main"), std::make_shared<TestSigner>(),
        [&](auto configuration, auto delegate, auto target) -> std::shared_ptr<TransferSession> {
            if (++calls == 1) throw std::runtime_error("no agent");
            return shelf.factory()(configuration, delegate, target);
        });
    service->submit(request("A"));
    EXPECT_TRUE(log.has(LogLevel::error, "Upload session could not be created, error=no agent"));
    service->submit(request("A"));
    EXPECT_EQ(shelf.only()->uploads().size(), 1u);
}

TEST_F(UploadServiceTest, DeliversToARealServerAndWakesUpWithTheProcessSession) {
    test::ScriptedServer server;
    server.script(test::ScriptedServer::Reply::status(200, {{"X-Id", "7"}}));
    server.script(test::ScriptedServer::Reply::status(500));
    service = std::make_shared<UploadService>(Endpoint(server.url("/in"), "main"), std::make_shared<TestSigner>());
    service->setDelegate(books);
    service->registerAccessQueue(queue);
    const std::string binary("\x1f\x8b\0\xff", 4);
    service->submit(request("A", binary));
    const UploadResponse response{200, {{"Content-Length", "0"}, {"X-Id", "7"}}};
    EXPECT_EQ(books->wait(1)[0], "success A " + response.description());
    service->resubmit({request("A"), {"B", "text/x", "me/1", documents / "missing"}});
    const auto results = books->wait(3);
    EXPECT_EQ(results[1] + ", " + results[2], results[1] == "retry B" ? "retry B, retry A" : "retry A, retry B");
    ASSERT_TRUE(server.waitForRequests(2));
    EXPECT_EQ(server.requests()[0].body, binary);
    EXPECT_EQ(server.requests()[1].header("X-Veskar-ActionSignature"), "signed body");

    const auto woken = std::make_shared<std::promise<void>>();
    EXPECT_TRUE(service->shouldResume(UploadService::sessionIdentifier, [woken] { woken->set_value(); }));
    EXPECT_EQ(woken->get_future().wait_for(std::chrono::seconds(10)), std::future_status::ready);
}

}  // namespace
}  // namespace corvane
