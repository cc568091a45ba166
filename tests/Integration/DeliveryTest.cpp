#include <corvane/Testing/ProcessSettings.h>

#include "tests/Integration/FaultFixture.h"

#include <corvane/Signing/SHA1.h>
#include <corvane/Upload/UploadService.h>

namespace corvane::test {
namespace {

class Delivery : public ::testing::Test, protected FaultFixture {};

TEST_F(Delivery, ADocumentArrivesSignedCompressedAndWhole) {
    Application application(server.url("/events"));
    application.submit(2);
    application.sessions.endSync();
    EXPECT_EQ(application.wait().delivered, (DeliveryReport::Count{2, 1}));

    ASSERT_EQ(server.requests().size(), 1u);
    const auto request = server.requests()[0];
    EXPECT_EQ(request.method + " " + request.path, "PUT /events");
    EXPECT_EQ(request.header("Content-Type"), "application/vnd.veskar.corvane.user_events+json; version=0.1.0");
    EXPECT_EQ(request.header("User-Agent"), "com.example.player/2.3.117");
    EXPECT_EQ(request.header("Content-Encoding"), "gzip");
    EXPECT_EQ(request.header("Content-Length"), std::to_string(request.body.size()));
    EXPECT_EQ(request.header("Expect") + request.header("Transfer-Encoding"), "");

    const std::string publicKey = readFile(documents / "com.veskar.corvane.signing-key.pub.pem");
    EXPECT_TRUE(verifies(publicKey, sha1Digest(request.body), request.header("X-Veskar-ActionSignature")));

    const JSON document = server.documents()[0];
    const auto event = document["data"]["events"][1];
    EXPECT_EQ(event["metadata"].text(), R"({"name":"ScreenView","version":"0.1.0"})");
    EXPECT_EQ(event["data"]["event"]["eventPath"].string(), "/root");
    EXPECT_EQ(event["data"]["event"]["sessionID"].string(), document["data"]["session"]["sessionID"].string());
    EXPECT_EQ(eventIDs({document}).size(), 2u);
    EXPECT_TRUE(payloads().empty());
}

TEST_F(Delivery, AWakeUpGoesFromTheProcessorManagerToTheMainQueueAndBack) {
    std::promise<std::thread::id> woken;
    std::promise<std::function<void()>> posted;
    ProcessSettings settings;
    settings.setMainQueue([&](std::function<void()> task) { posted.set_value(std::move(task)); });
    Application application(server.url());
    application.submit();
    const auto manager = application.sessions.processorManager();
    manager->resumeBackgroundProcessing(std::string(UploadService::sessionIdentifier),
                                        [&] { woken.set_value(std::this_thread::get_id()); });
    posted.get_future().get()();  // this thread is the host's event loop
    EXPECT_EQ(woken.get_future().get(), std::this_thread::get_id());
    EXPECT_TRUE(
        log.waitFor("Event processor handled background resuming for identifier=com.veskar.corvane.upload-session"));
    manager->resumeBackgroundProcessing("another", [] {});
    EXPECT_TRUE(log.waitFor("Deferring background resuming"));
}

}  // namespace
}  // namespace corvane::test
