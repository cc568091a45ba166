#include "tests/Integration/Application.h"
#include "tests/support/ProcessSettings.h"

#include <corvane/Platform/Bytes.h>
#include <corvane/Signing/SHA1.h>
#include <corvane/Signing/SigningServiceType.h>
#include <corvane/Upload/UploadService.h>

#include "tests/support/CapturedLog.h"
#include "tests/support/Documents.h"
#include "tests/support/TemporaryDocuments.h"

#include <gtest/gtest.h>

#include <future>
#include <thread>

namespace corvane::test {
namespace {

using Reply = ScriptedServer::Reply;

class Delivery : public ::testing::Test {
  protected:
    std::filesystem::path dropbox() { return documents / "com.veskar.corvane.main.upload-dropbox"; }
    bool dropboxIsEmpty() { return !std::filesystem::exists(dropbox()) || std::filesystem::is_empty(dropbox()); }

    CapturedLog log;
    TemporaryDocuments documents;
    ScriptedServer server;
};

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
    const std::string signature = request.header("X-Veskar-ActionSignature");
    bool verified = false;
    for (const auto& line : log.lines()) {
        // The signature's bytes are in the log in hexadecimal; the header carries them in base64.
        constexpr std::string_view prefix = "Generated signature from SHA1, signature=";
        if (!line.message.starts_with(prefix)) continue;
        std::string bytes;
        for (std::size_t i = prefix.size(); i < line.message.size(); i += 2) {
            bytes += static_cast<char>(std::stoi(line.message.substr(i, 2), nullptr, 16));
        }
        verified = base64String(bytes) == signature && verifies(publicKey, sha1Digest(request.body), bytes);
    }
    EXPECT_TRUE(verified);

    const JSON document = documentsAt(server)[0];
    const auto event = document["data"]["events"][1];
    EXPECT_EQ(event["metadata"].text(), R"({"name":"ScreenView","version":"0.1.0"})");
    EXPECT_EQ(event["data"]["event"]["eventPath"].string(), "/root");
    EXPECT_EQ(event["data"]["event"]["sessionID"].string(), document["data"]["session"]["sessionID"].string());
    EXPECT_EQ(eventIDs({document}).size(), 2u);
    EXPECT_TRUE(dropboxIsEmpty());
}

TEST_F(Delivery, WhatLiesOnDiskIsPrivateAndNamedAfterTheEndpoint) {
    server.script(Reply::status(500));
    {
        Application application(server.url(), 50, true);
        application.submit();
        application.sessions.endSync();
        EXPECT_EQ(application.wait().pending, (DeliveryReport::Count{1, 1}));
    }
    EXPECT_EQ(permissions(documents / "com.veskar.corvane.main.db"), 0600u);
    EXPECT_EQ(permissions(documents / "com.veskar.corvane.signing-key.pem"), 0600u);
    EXPECT_EQ(permissions(dropbox()), 0700u);
    const auto payload = std::filesystem::directory_iterator(dropbox())->path();
    EXPECT_EQ(permissions(payload), 0600u);
    const auto copies = documents / "com.veskar.corvane.main.upload-dropbox.debugging";
    const auto identifier = payload.filename().string();
    EXPECT_EQ(readFile(copies / (identifier + ".request.json")), gunzip(readFile(payload)));
    EXPECT_FALSE(std::filesystem::exists(copies / (identifier + ".response.json"))) << "a retry is not an answer";

    server.script(Reply::status(201, {{"X-Trace", "t"}}));
    Application application(server.url(), 50, true);
    EXPECT_EQ(application.wait().delivered.documents, 1);
    EXPECT_EQ(JSON(readFile(copies / (identifier + ".response.json")))["statusCode"].integer(), 201);
    EXPECT_EQ(permissions(copies / (identifier + ".response.json")), 0600u);
    EXPECT_TRUE(dropboxIsEmpty());
}

TEST_F(Delivery, ARefusedDocumentIsGivenUpAndOneThatFailsForNowGoesOutWithTheNextRun) {
    server.script(Reply::status(404));
    server.script(Reply::status(503));
    server.script(Reply::raw("not HTTP at all\r\n\r\n"));
    {
        Application application(server.url(), 1);
        application.submit();
        EXPECT_EQ(application.wait().givenUp, (DeliveryReport::Count{1, 1}));
        application.submit(2);
        const auto report = application.wait();
        EXPECT_EQ(report.pending, (DeliveryReport::Count{2, 2}));
        EXPECT_EQ(report.delivered, DeliveryReport::Count{});
        application.sessions.endSync();
        application.sessions.start(Session::Kind::userEvents());
        EXPECT_EQ(application.wait(), report) << "a manager sends again once, when it is first opened";
    }
    Application application(server.url(), 1);
    EXPECT_EQ(application.wait().delivered.documents, 2);
    const auto received = documentsAt(server);
    ASSERT_EQ(received.size(), 5u);
    const auto sent = eventIDs({received[1], received[2]});
    EXPECT_EQ(eventIDs({received[3], received[4]}), sent);
}

TEST_F(Delivery, AWakeUpGoesFromTheProcessorManagerToTheMainQueueAndBack) {
    std::promise<std::thread::id> woken;
    std::promise<std::thread::id> ran;
    std::thread::id mainThread;
    std::promise<std::function<void()>> posted;
    ProcessSettings settings;
    settings.setMainQueue([&](std::function<void()> task) { posted.set_value(std::move(task)); });

    Application application(server.url());
    application.submit();
    application.sessions.processorManager()->resumeBackgroundProcessing(
        std::string(UploadService::sessionIdentifier), [&] { woken.set_value(std::this_thread::get_id()); });
    posted.get_future().get()();  // this thread is the host's event loop
    EXPECT_EQ(woken.get_future().get(), std::this_thread::get_id());
    EXPECT_TRUE(log.has(LogLevel::default_,
                        "Should resume session? identifier=com.veskar.corvane.upload-session, result=1, "
                        "numberOfCompletions=0"));
    EXPECT_TRUE(
        log.waitFor("Event processor handled background resuming for identifier=com.veskar.corvane.upload-session"));
    EXPECT_EQ(log.count("Upload invoking background completions for session, "
                        "identifier=com.veskar.corvane.upload-session, numberOfCompletions=1"),
              1);
    application.sessions.processorManager()->resumeBackgroundProcessing("another", [] {});
    EXPECT_TRUE(log.waitFor("Deferring background resuming"));
}

}  // namespace
}  // namespace corvane::test
