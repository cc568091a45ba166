#include "tests/Integration/FaultFixture.h"
#include "tests/support/PassTime.h"

#include <corvane/Signing/SHA1.h>

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

/// Knows the queue of the session manager to which it is added.
struct QueueFinder final : EventProcessorType {
    void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) override { queue = std::move(accessQueue); }
    void process(const ProcessEvent&) override {}
    std::shared_ptr<SerialQueue> queue;
};

TEST_F(Delivery, WhatTheServerTurnsAwayArrivesInTheSameRunWhenItSaysSo) {
    server.script(ScriptedServer::Reply::status(503, {{"Retry-After", "3600"}}));
    server.script(ScriptedServer::Reply::status(503));
    const auto time = std::make_shared<QueueFinder>();
    std::promise<std::optional<std::int64_t>> delivered;
    Application application(server.url(), UploadBatchEventConfig({.maximumDelay = 10min, .retryDelay = 1min}), "main",
                            [&](const DeliveryUpdate& update) {
                                if (update.step == DeliveryUpdate::Step::delivered) delivered.set_value(update.events);
                            });
    application.sessions.processorManager()->add(time);
    application.submit(2);
    passTime(*time->queue, 10min);
    EXPECT_EQ(application.wait().pending, (DeliveryReport::Count{2, 1}));
    passTime(*time->queue, 3500s);
    EXPECT_EQ(server.requests().size(), 1u);
    passTime(*time->queue, 1h);
    ASSERT_TRUE(server.waitForRequests(2));
    while (log.count("Upload HTTP failed, identifier=") < 2) std::this_thread::yield();
    for (int minutes = 0; minutes < 3; ++minutes) passTime(*time->queue, 1min);
    EXPECT_EQ(delivered.get_future().get(), 2);
    EXPECT_EQ(application.wait(), (DeliveryReport{{2, 1}, {}, {}}));
    EXPECT_EQ(eventIDs(server.documents()).size(), 6u);
    EXPECT_TRUE(rows().empty() && payloads().empty());
}

}  // namespace
}  // namespace corvane::test
