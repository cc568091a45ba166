#include <corvane/Testing/ProcessSettings.h>

#include "tests/Integration/FaultFixture.h"
#include "tests/support/TLSServer.h"

#include <corvane/Transfer/InProcessTransferSession.h>

namespace corvane::test {
namespace {

using Reply = ScriptedServer::Reply;
using Ending = Reply::Ending;
using Becomes = DeliveryReport;

/// Sessions that give up within two seconds.
std::shared_ptr<TransferSession> impatient(TransferSessionConfiguration configuration,
                                           std::weak_ptr<TransferSessionDelegate> delegate,
                                           std::shared_ptr<SerialQueue> queue) {
    configuration.limits.timeWithoutProgress = 1s;
    configuration.limits.answer = 2s;
    return std::make_shared<InProcessTransferSession>(configuration, std::move(delegate), std::move(queue));
}

int endings(const CapturedLog& log) {
    return log.count("Upload failed, identifier=") + log.count("Upload completed successfully, identifier=") +
           log.count("Upload HTTP failed") + log.count("Upload unknown state");
}

TEST(ServerFaults, OneFaultCostsOneDocumentAtMostAndTheOthersArrive) {
    std::string endlessHead = "HTTP/1.1 200 OK\r\n";
    for (int i = 0; i < 6000; ++i) endlessHead += "X-" + std::to_string(i) + ": " + std::string(50, 'x') + "\r\n";
    const struct {
        const char* name;
        Reply reply;
        Becomes::Count Becomes::*becomes;
        const char* says;  // what the log has then
    } cases[] = {
        {"interim answer", Reply::raw("HTTP/1.1 103 Early\r\nA: b\r\n\r\nHTTP/1.1 204 Done\r\n\r\n"),
         &Becomes::delivered, "status=204"},
        {"redirect", Reply::status(302, {{"Location", "/elsewhere"}}), &Becomes::givenUp, "statusCode=302"},
        {"401", Reply::status(401), &Becomes::pending, "status=401"},
        {"413", Reply::status(413), &Becomes::givenUp, "status=413"},
        {"429", Reply::status(429, {{"Retry-After", "1"}}), &Becomes::pending, "statusCode=429"},
        {"503", Reply::status(503), &Becomes::pending, "statusCode=503"},
        {"reset inside the request",
         {.bytes = "", .ending = Ending::reset, .bodyLimit = 0},
         &Becomes::pending,
         "Upload failed"},
        {"reset inside the answer", Reply::partial(Ending::reset), &Becomes::pending, "Upload failed"},
        {"closed without an answer", Reply::raw(""), &Becomes::pending, "Upload failed"},
        {"garbage", Reply::raw("SSH-2.0-server\r\n\r\n"), &Becomes::pending, "Upload failed"},
        {"endless head", Reply::raw(endlessHead), &Becomes::pending, "Upload failed"},
        {"endless body", Reply::partial(Ending::endless), &Becomes::delivered, "status=200"},
        {"never an answer", Reply::never(), &Becomes::pending, "nothing was sent or received for 1000 ms"},
        {"stall inside the answer", Reply::partial(Ending::silence), &Becomes::pending, "nothing was sent or received"},
        {"head that trickles",
         {.bytes = "HTTP/1.1 200 OK\r\n", .ending = Ending::trickle},
         &Becomes::pending,
         "no answer came within 2000 ms"},
        {"body that trickles", Reply::partial(Ending::trickle), &Becomes::delivered, "status=200"},
    };
    for (const auto& one : cases) {
        SCOPED_TRACE(one.name);
        FaultFixture disk;
        {
            ProcessSettings settings;
            settings.setTransfers(impatient);
            disk.server.script(one.reply);
            Application application(disk.server.url(), 1);
            application.submit(5);
            DeliveryReport expected{{4, 4}, {}, {}};
            auto& [events, documents] = expected.*one.becomes;
            ++events, ++documents;
            EXPECT_EQ(application.wait(), expected);
            EXPECT_GE(disk.log.count(one.says), 1);
        }
        EXPECT_EQ(endings(disk.log), 5) << "each transfer ends once";
        EXPECT_EQ(disk.server.requests().size(), 5u);
        const auto rows = FaultFixture::rows();
        ASSERT_EQ(rows.size(), one.becomes == &Becomes::pending ? 1u : 0u);
        EXPECT_EQ(disk.payloads().size(), rows.size());
        for (const auto& row : rows) {
            EXPECT_EQ(row.retries, 1);
            EXPECT_TRUE(std::filesystem::exists(disk.dropbox() / row.identifier));
        }
        EXPECT_EQ(disk.runAgain().delivered.documents, std::ssize(rows));
        EXPECT_TRUE(FaultFixture::rows().empty());
        EXPECT_TRUE(disk.payloads().empty());
    }
}

TEST(ServerFaults, AServerThatIsNotThereOrCannotBeTrustedGetsNothingAndCostsNothing) {
    const TLSServer untrusted;
    const std::string nobody = ScriptedServer().url();
    const struct {
        std::string url;
        const char* reason;
        std::int64_t counted;  // attempts behind a captive portal must not use a document up
    } cases[] = {{nobody, "Couldn't connect to server", 1}, {untrusted.url(), "self-signed certificate", 0}};
    for (const auto& [url, reason, counted] : cases) {
        SCOPED_TRACE(url);
        FaultFixture disk;
        {
            Application application(url, 1);
            application.submit(5);
            EXPECT_EQ(application.wait().pending, (DeliveryReport::Count{5, 5}));
        }
        EXPECT_EQ(disk.log.count(reason), 5);
        EXPECT_EQ(endings(disk.log), 5);
        EXPECT_EQ(FaultFixture::rows().size(), 5u);
        for (const auto& row : FaultFixture::rows()) EXPECT_EQ(row.retries, counted);
        EXPECT_EQ(disk.runAgain().delivered.documents, 5);
        EXPECT_EQ(disk.distinctEvents(), 5u);
    }
}

}  // namespace
}  // namespace corvane::test
