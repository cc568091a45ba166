#include <corvane/Agent/AgentMessage.h>
#include <corvane/Agent/FrameSocket.h>
#include <corvane/Agent/Host/TransferDiscard.h>

#include "tests/Agent/AgentFixture.h"

#include <poll.h>
#include <signal.h>
#include <sys/socket.h>

namespace corvane::test {
namespace {

using Reply = ScriptedServer::Reply;
using Outcomes = SessionRecorder::Outcomes;

constexpr const char* nowhere = "http://127.0.0.1:1/";
constexpr std::size_t large = 1'000'000;

class CancelTest : public AgentFixture {
  protected:
    CancelTest() {
        slow.bodyLimit = 10;
        server.script(slow);
        server.script(Reply::never());
    }
    std::shared_ptr<TransferTask> upload(TransferSession& session, const std::string& url, const std::string& name) {
        return AgentFixture::upload(session, url, name, std::string(large, 'b'));
    }
    /// Lets the server go on reading the first request, once nobody sends it any more.
    void expectFirstBodyIsCut(int held = 1) {
        server.release(held);
        EXPECT_TRUE(eventually([&] { return server.requests().at(0).body.size() > 10; }));
        EXPECT_LT(server.requests().at(0).body.size(), large) << "nor does the system send what it was given";
    }
    static std::future<DiscardResult> discard(const std::filesystem::path& directory) {
        const auto told = std::make_shared<std::promise<DiscardResult>>();
        TransferDiscard::start(directory, [told](const DiscardResult& result) { told->set_value(result); });
        return told->get_future();
    }

    Reply slow = Reply::status(200).hold();
};

TEST_F(CancelTest, TheAgentDropsATaskWhereverItIsAndEverySessionOfItsOwnerHears) {
    const auto other = std::make_shared<SessionRecorder>();
    auto session = open(recorder), second = open(other);
    std::vector<std::shared_ptr<TransferTask>> tasks{upload(*session, server.url(), "sending")};
    ASSERT_TRUE(server.waitForRequests(1));
    tasks.push_back(upload(*session, server.url(), "unanswered"));
    ASSERT_TRUE(server.waitForRequests(2));
    tasks.push_back(upload(*session, nowhere, "held up"));
    ASSERT_TRUE(log.waitFor("Uploads wait for their server"));
    tasks.push_back(session->uploadTask({.url = server.url(), .headers = {}}, body("suspended")));
    tasks.back()->setDescription("suspended");
    EXPECT_EQ(running(*second).size(), 3u);
    // Of another process, as far as the second session knows.
    second->tasks([](const auto& known) { known.at(0)->cancel(); });
    ASSERT_TRUE(other->wait(1) && recorder->wait(1));
    for (const auto& task : tasks) task->cancel();
    tasks.back()->resume();
    ASSERT_TRUE(recorder->wait(4) && other->wait(3));
    EXPECT_EQ(recorder->outcomes(),
              (Outcomes{{"unanswered", "cancelled"}, {"held up", "cancelled"}, {"suspended", "cancelled"}}));
    EXPECT_EQ(recorder->elsewhere(), (Outcomes{{"sending", "network"}}));
    EXPECT_EQ(other->outcomes(), (Outcomes{{"sending", "cancelled"}}));
    EXPECT_EQ(other->elsewhere(), (Outcomes{{"unanswered", "network"}, {"held up", "network"}}));
    EXPECT_TRUE(log.waitFor("Uploads to a server go on")) << "nobody would say so later";
    expectFirstBodyIsCut();

    for (int i = 0; i < 30; ++i) upload(*session, server.url(), "early " + std::to_string(i))->cancel();
    ASSERT_TRUE(recorder->wait(34));
    for (const auto& [name, outcome] : recorder->outcomes()) {
        EXPECT_TRUE(outcome == "cancelled" || outcome == "200") << name << ": " << outcome;
    }
    EXPECT_TRUE(running(*session).empty());
    EXPECT_TRUE(eventually([&] { return files("withdrawn") + files("spool") == 0; }));
}

TEST_F(CancelTest, ATaskIsCancelledWithoutAnAgentsWordAndInsideTheProcessAndNoLaterAgentSendsIt) {
    options.deadline = 300ms;
    auto session = open(recorder);
    const auto sending = upload(*session, server.url(), "sending");
    ASSERT_TRUE(server.waitForRequests(1));
    kill(SIGSTOP);
    const auto spooled = upload(*session, server.url(), "spooled"), inside = upload(*session, server.url(), "inside");
    sending->cancel();
    spooled->cancel();
    EXPECT_EQ(sending->state(), TransferTask::State::cancelling);
    ASSERT_TRUE(server.waitForRequests(2) && recorder->wait(2)) << "the agent is given up";
    EXPECT_EQ(discard(documents.path()).get().problem, "no answer in time");
    inside->cancel();
    ASSERT_TRUE(recorder->wait(3));
    EXPECT_EQ(recorder->outcomes(),
              (Outcomes{{"sending", "cancelled"}, {"spooled", "cancelled"}, {"inside", "cancelled"}}));
    session.reset();
    kill(SIGCONT);
    EXPECT_TRUE(eventually([&] { return files("withdrawn") + files("spool") == 0; }));
    expectFirstBodyIsCut();
    const auto told = std::make_shared<SessionRecorder>();
    session = open(told);
    EXPECT_TRUE(running(*session).empty() && told->outcomes().empty());
    EXPECT_EQ(server.requests().size(), 2u);
}

TEST_F(CancelTest, AgentsDiscardWhatLayBeneathADirectoryOfEveryOwnerAndNothingElse) {
    for (const auto* folder : {"body mine/deep", "body mine2"}) std::filesystem::create_directories(documents / folder);
    std::filesystem::create_directory_symlink(documents / "body mine", documents / "body link");
    EXPECT_EQ(discard(documents / "body mine").get().status, DiscardResult::Status::nobody);
    {
        const auto listener = AgentDirectory(documents / AgentDirectory::usualName).listen();
        auto asked = discard(documents / "body mine");
        pollfd polled{listener.get(), POLLIN, 0};
        ASSERT_EQ(poll(&polled, 1, 10'000), 1);
        FrameSocket old(Descriptor(accept4(listener.get(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK)));
        old.send(agent::encode(agent::Welcome{}));
        old.send(agent::encode(agent::Unsupported{agent::Discard::kind}));
        EXPECT_TRUE(old.flush());
        EXPECT_EQ(asked.get().problem, "the agent is too old to discard tasks");
    }
    auto gone = open(std::make_shared<SessionRecorder>(), "gone");
    upload(*gone, server.url(), "mine/sending");
    ASSERT_TRUE(server.waitForRequests(1));
    upload(*gone, server.url(), "mine/deep/unanswered");
    ASSERT_TRUE(server.waitForRequests(2));
    upload(*gone, server.url(), "mine/over");  // and unacknowledged
    gone.reset();
    ASSERT_TRUE(server.waitForRequests(3));
    auto session = open(recorder);
    server.script(Reply::status(200).hold());
    upload(*session, server.url(), "mine2/foreign");
    upload(*session, nowhere, "link/held up");
    ASSERT_TRUE(log.waitFor("Uploads wait for their server"));
    for (const char* name : {"mine/sending", "mine/deep/unanswered", "mine/held up"}) {
        std::filesystem::remove(documents / ("body " + std::string(name)));
    }
    const auto result = discard(documents / "body mine/").get();
    EXPECT_EQ(result.dropped, 3) << result.problem;
    ASSERT_TRUE(recorder->wait(1));
    EXPECT_EQ(recorder->elsewhere(), (Outcomes{{"link/held up", "network"}}));
    EXPECT_EQ(running(*session), std::vector<std::string>{"mine2/foreign"});
    expectFirstBodyIsCut(2);
    ASSERT_TRUE(recorder->wait(2));
    EXPECT_EQ(recorder->outcomes(), (Outcomes{{"mine2/foreign", "200"}}));
    session.reset();
    kill(SIGKILL);
    const auto told = std::make_shared<SessionRecorder>();
    gone = open(told, "gone");
    ASSERT_TRUE(running(*gone).empty() && told->wait(1));
    EXPECT_EQ(told->outcomes(), (Outcomes{{"mine/over", "200"}})) << "whose body is there; of others there is nothing";
}

}  // namespace
}  // namespace corvane::test
