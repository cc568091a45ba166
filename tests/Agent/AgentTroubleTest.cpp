#include "tests/Agent/AgentFixture.h"
#include "tests/support/TLSServer.h"

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Agent/AgentMessage.h>
#include <corvane/Agent/FrameSocket.h>

#include <poll.h>
#include <signal.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <unistd.h>

#include <atomic>
#include <cstdlib>
#include <future>
#include <thread>

namespace corvane::test {
namespace {

using Reply = ScriptedServer::Reply;
using Outcomes = std::map<std::string, std::string>;

constexpr const char* waits = "Uploads wait for their server";

class AgentTroubleTest : public AgentFixture {};

TEST_F(AgentTroubleTest, WaitsWhereTheWayIsBlockedWithoutCountingAndSaysSoOnce) {
    const TLSServer secure, other;
    const auto authorities = body("authorities", other.certificate());
    auto session =
        open(recorder, TransferSessionConfiguration{.identifier = "session", .trustedCertificates = authorities});
    upload(*session, secure.url(), "a");
    upload(*session, secure.url(), "b");
    ASSERT_TRUE(log.waitFor(waits));
    // Another's trust is its own: what one cannot reach the other can.
    const auto trusting = std::make_shared<SessionRecorder>();
    const auto right = body("right", secure.certificate());
    auto second = open(trusting, TransferSessionConfiguration{
                                     .identifier = "session", .ownerKey = "second", .trustedCertificates = right});
    upload(*second, secure.url(), "c");
    ASSERT_TRUE(trusting->wait(1));
    EXPECT_EQ(trusting->outcomes(), (Outcomes{{"c", "200"}}));
    EXPECT_EQ(running(*session), (std::vector<std::string>{"a", "b"}));
    EXPECT_EQ(log.count(waits), 1);

    writeFile(authorities, secure.certificate());
    ASSERT_TRUE(recorder->wait(2));
    EXPECT_EQ(recorder->outcomes(), (Outcomes{{"a", "200"}, {"b", "200"}}));
    EXPECT_EQ(log.count(waits), 1);
    EXPECT_TRUE(log.waitFor("Uploads to a server go on"));
}

TEST_F(AgentTroubleTest, TakesTheProxyOfWhoeverHandsTheUploadOver) {
    setenv("http_proxy", "http://127.0.0.1:1", 1);
    auto session = open(recorder);
    EXPECT_TRUE(running(*session).empty()) << "the agent has started with this one";
    setenv("http_proxy", ("http://user:secret@" + server.url("").substr(7)).c_str(), 1);
    server.script(Reply::status(407, {{"Proxy-Authenticate", "Basic realm=x"}}));
    upload(*session, "http://collector.test/in", "a");
    unsetenv("http_proxy");
    ASSERT_TRUE(recorder->wait(1));
    EXPECT_EQ(recorder->outcomes(), (Outcomes{{"a", "200"}}));
    EXPECT_EQ(server.requests().at(0).path, "http://collector.test/in");
    EXPECT_EQ(log.count(waits), 1);
    EXPECT_EQ(log.count("secret"), 0);
}

TEST_F(AgentTroubleTest, ABadDocumentHoldsUpNoOther) {
    std::string head = "HTTP/1.1 200 OK\r\nContent-Length: 0\r\n";
    for (int i = 0; head.size() < 250'000; ++i) head += std::to_string(i) + ":\r\n";
    auto session =
        open(recorder, TransferSessionConfiguration{.identifier = "session", .limits = {.transfersPerHost = 1}});
    upload(*session, server.url(), "first");
    ASSERT_TRUE(recorder->wait(1));
    server.script(Reply::raw(""), 2);  // libcurl itself tries a connection that was there already once more
    server.script(Reply::raw(head + "\r\n"));
    for (const auto* name : {"bad", "many fields", "later"}) upload(*session, server.url(), name);
    ASSERT_TRUE(recorder->wait(4));
    EXPECT_EQ(recorder->outcomes(),
              (Outcomes{{"first", "200"}, {"bad", "network"}, {"many fields", "200"}, {"later", "200"}}));
    EXPECT_EQ(log.count(waits) + log.count("agent"), 0);
}

TEST_F(AgentTroubleTest, EveryHostOfAnOwnerHearsOfTheEnd) {
    server.script(Reply::status(201).hold());
    auto session = open(recorder);
    upload(*session, server.url(), "a");
    ASSERT_TRUE(server.waitForRequests(1));
    const auto other = std::make_shared<SessionRecorder>();
    auto second = open(other);
    EXPECT_EQ(running(*second), std::vector<std::string>{"a"});
    server.release();
    ASSERT_TRUE(recorder->wait(1) && other->wait(1));
    EXPECT_EQ(recorder->outcomes(), (Outcomes{{"a", "201"}}));
    EXPECT_EQ(other->elsewhere(), (Outcomes{{"a", "201"}}));
    EXPECT_TRUE(running(*second).empty() && recorder->elsewhere().empty() && other->outcomes().empty());
}

TEST_F(AgentTroubleTest, EndsWithNeitherAHostNorAServerAndGoesOnWithTheNextHost) {
    const LatePort late;
    options.patienceWithoutHost = 200ms;
    auto session = open(recorder);
    upload(*session, late.url(), "a");
    ASSERT_TRUE(log.waitFor(waits));
    const auto first = agent();
    EXPECT_FALSE(eventually([&] { return agent() != first; }, 400ms)) << "it stays for its host";
    session.reset();
    ASSERT_TRUE(eventually([&] { return agent() == 0; }));
    session = open(recorder);
    EXPECT_EQ(running(*session), std::vector<std::string>{"a"});
    late.answerOne();
    ASSERT_TRUE(recorder->wait(1));
    EXPECT_EQ(recorder->outcomes(), (Outcomes{{"a", "200"}}));
}

}  // namespace
}  // namespace corvane::test
