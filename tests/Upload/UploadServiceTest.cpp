#include <corvane/Testing/ProcessSettings.h>
#include <corvane/Upload/UploadService.h>

#include <corvane/Platform/MainQueue.h>
#include <corvane/Testing/FakeTransferSession.h>
#include <corvane/Transfer/TransferError.h>
#include <corvane/Upload/PreparedUploadRequest.h>
#include <corvane/Upload/UploadServiceDelegate.h>

#include "tests/support/Testing.h"

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

/// Keeps what it is told, on the queue.
struct Books final : UploadServiceDelegate {
    void uploadService(UploadServiceType&, const UploadResult& result) override { results.push_back(describe(result)); }
    static std::string describe(const UploadResult& result) {
        if (const auto* success = std::get_if<UploadResult::Success>(&result.value)) {
            return "success " + success->identifier + ' ' + success->response.description();
        }
        if (const auto* failed = std::get_if<UploadResult::Failed>(&result.value)) {
            return "failed " + failed->identifier + ' ' + std::to_string(failed->response.statusCode);
        }
        const auto& retry = std::get<UploadResult::Retry>(result.value);
        return (retry.isCounted ? "retry " : "uncounted ") + retry.identifier;
    }
    std::vector<std::string> results;
};

class UploadServiceTest : public testing::Test {
  protected:
    void make(EndpointOptions options = {}) {
        service =
            std::make_shared<UploadService>(Endpoint("https://collector.example.com/in", "Main", options),
                                            std::make_shared<TestSigner>(), FakeTransferSession::factory(session));
        service->setDelegate(books);
        service->registerAccessQueue(queue);
    }
    UploadServiceTest() { make(); }
    PreparedUploadRequest request(const std::string& identifier, std::string_view contents = "body") {
        test::writeFile(documents / identifier, contents);
        return {identifier, "text/x; version=1", "me/1", documents / identifier};
    }

    test::CapturedLog log;
    test::TemporaryDocuments documents;
    std::shared_ptr<FakeTransferSession> session;  // that the service has opened
    std::shared_ptr<SerialQueue> queue = std::make_shared<SerialQueue>("test");
    std::shared_ptr<Books> books = std::make_shared<Books>();
    std::shared_ptr<UploadService> service;
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
    service->resubmit({});
    EXPECT_FALSE(session);
    service->submit(request("A"));
    service->submit(request("B", "unsignable"));
    service->submit({"C", "text/x\r\nEvil: 1", "me/1", documents / "missing"});
    ASSERT_TRUE(session);
    const auto& configuration = session->configuration;
    EXPECT_EQ(configuration.identifier, "com.veskar.corvane.upload-session");
    EXPECT_EQ(session->description(), "com.veskar.corvane.upload-session");
    EXPECT_TRUE(configuration.discretionary && configuration.relaunchesForEvents);
    EXPECT_EQ(configuration.ownerKey, UploadService::ownerKey(Endpoint("https://other.example.com", " main ")));
    EXPECT_NE(configuration.ownerKey, UploadService::ownerKey(Endpoint("https://other.example.com", "second")));

    ASSERT_EQ(session->made().size(), 3u);
    const auto& first = *session->task(1);
    EXPECT_EQ(first.description(), "A");
    EXPECT_EQ(first.state(), State::running);
    EXPECT_EQ(first.file, documents / "A");
    EXPECT_EQ(first.request.headers[3].second, "signed body");
    EXPECT_EQ(session->task(2)->request.headers[3].second, "SigningFailure=no  key: 1");
    EXPECT_EQ(session->task(3)->request.headers[0].second, "text/x  Evil: 1");
    EXPECT_TRUE(session->task(3)->request.headers[3].second.starts_with("SigningFailure=cannot read "));
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
    make(options);
    for (const char* identifier : {"A", "B", "C"}) service->submit(request(identifier));
    const auto added = [&](std::size_t upload) {
        const auto& headers = session->made().at(upload)->request.headers;
        return HTTPHeaders(headers.begin() + 4, headers.end());
    };
    EXPECT_EQ(session->configuration.trustedCertificates, "/etc/ca.pem");
    EXPECT_EQ(added(0), (HTTPHeaders{{"Authorization", "Bearer 1"}, {"X-Mine", ""}}));
    EXPECT_EQ(added(1), (HTTPHeaders{{"Authorization", "Bearer 2"}, {"X-Mine", ""}}));
    EXPECT_EQ(added(2), HTTPHeaders{});
    EXPECT_EQ(log.count("Header of the endpoint is not sent, name="), 8);
    EXPECT_EQ(log.count("Host code failed, call=endpoint headers, error=no token"), 1);
    EXPECT_EQ(log.count("secret") + log.count("Bearer"), 0);
}

TEST_F(UploadServiceTest, ReportsEveryEndingOfATask) {
    using Code = TransferError::Code;
    using Outcome = FakeTransferSession::Outcome;
    service->submit(request("A"));
    session->complete(1, Outcome::failure(Code::network, "no luck"));
    session->complete(1, Outcome::failure(Code::blocked, "no luck"));
    session->complete(1, Outcome{});
    session->complete(1, Outcome{std::nullopt, TransferResponse{.isHTTP = false, .statusCode = 200, .headers = {}}});
    session->complete(1, 204, {{"A", "b"}});
    session->complete(1, 200, {{"A", "b"}, {"B", "\xff"}});
    for (const int status : {401, 404, 503, 302}) session->complete(1, status);
    session->uploadTask({}, {})->resume();
    session->complete(2, 404);
    queue->sync([] {});
    const std::vector<std::string> expected{"retry A",
                                            "uncounted A",
                                            "retry A",
                                            "retry A",
                                            "success A " + UploadResponse{204, {{"A", "b"}}}.description(),
                                            "success A " + UploadResponse{200}.description(),
                                            "retry A",
                                            "failed A 404",
                                            "retry A",
                                            "failed A 302",
                                            "failed unknown 404"};
    EXPECT_EQ(books->results, expected);
    books.reset();
    session->complete(1, 400);
    EXPECT_TRUE(log.waitFor("status=400")) << "without a delegate it is logged only";
    EXPECT_TRUE(log.has(LogLevel::error,
                        "Upload failed, identifier=A, urlSessionTaskID=<com.veskar.corvane.upload-session>.<1>, "
                        "error=no luck"));
}

TEST_F(UploadServiceTest, ResubmitsWhatIsNotRunning) {
    for (const char* identifier : {"running", "suspended", "cancelling", "completed"}) {
        service->submit(request(identifier));
    }
    session->task(2)->setState(State::suspended);
    session->task(3)->setState(State::cancelling);
    session->complete(4, 503);  // still pending when the listing is asked for
    service->resubmit({request("running"), request("suspended"), request("cancelling"), request("completed")});
    queue->sync([] {});
    std::vector<std::string> again;
    for (std::size_t i = 4; i < session->made().size(); ++i) again.push_back(session->made()[i]->description().value());
    EXPECT_EQ(again, (std::vector<std::string>{"suspended", "cancelling", "completed"}));
}

TEST_F(UploadServiceTest, CallsTheCompletionsOfAWakeUpOnceInOrderOnTheMainQueue) {
    std::vector<std::function<void()>> mainLoop;
    test::ProcessSettings settings;
    settings.setMainQueue([&](auto task) { mainLoop.push_back(std::move(task)); });
    std::vector<int> called;
    const auto wake = [&](int number, std::string_view identifier = UploadService::sessionIdentifier) {
        return service->shouldResume(identifier, [&, number] {
            called.push_back(number);
            throw std::runtime_error("the host's");
        });
    };
    EXPECT_FALSE(wake(0, "other"));
    EXPECT_TRUE(wake(1) && wake(2));
    EXPECT_EQ(session->wakeUps(), 2);
    session->signalAllEventsDelivered();
    session->signalAllEventsDelivered();
    queue->sync([] {});
    EXPECT_TRUE(called.empty());
    ASSERT_EQ(mainLoop.size(), 2u);
    for (auto& task : mainLoop) task();
    EXPECT_EQ(called, (std::vector<int>{1, 2}));
    // Nothing is delivered any more when the service has gone, but nobody is left waiting.
    mainLoop.clear();
    EXPECT_TRUE(wake(3));
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
            return FakeTransferSession::factory(session)(configuration, delegate, target);
        });
    service->submit(request("A"));
    EXPECT_TRUE(log.has(LogLevel::error, "Upload session could not be created, error=no agent"));
    service->submit(request("A"));
    EXPECT_EQ(session->made().size(), 1u);
}

}  // namespace
}  // namespace corvane
