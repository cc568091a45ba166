#include <corvane/Agent/Host/Acknowledgements.h>
#include <corvane/Agent/Host/BackgroundTransferCore.h>
#include <corvane/Agent/OutcomeCodec.h>

#include "tests/support/Testing.h"

#include <fcntl.h>
#include <sys/socket.h>

namespace corvane::test {
namespace {

// A link whose agent is the test: at the other end of a socket pair, and of the pipe of a program that is started. The
// test's thread stands in for the agent's, and the time is what the test says.
class AgentLinkTest : public testing::Test, public AgentLink::Listener {
  protected:
    void agentIsReady() override { heard += "ready "; }
    void agentSaid(const agent::Reply& reply) override { heard += agent::encode(reply)[0]; }
    void agentFailed(const std::string&) override { heard += "failed "; }
    void processEnds() override {}
    void onThread() const CORVANE_ASSERT_CAPABILITY(agentThread) {}

    Descriptor connect() {
        int ends[2];
        errno = ECONNREFUSED;
        if (!listens || socketpair(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0, ends) != 0) return {};
        peer.emplace(Descriptor(ends[0]));
        return Descriptor(ends[1]);
    }
    AgentProgram::Started start() {
        int ends[2];
        EXPECT_EQ(pipe2(ends, O_NONBLOCK | O_CLOEXEC), 0);
        EXPECT_EQ(write(ends[1], lastWords.data(), lastWords.size()), static_cast<ssize_t>(lastWords.size()));
        close(ends[1]);
        ++starts;
        return {1234, Descriptor(ends[0])};
    }
    void open() {
        link = std::make_shared<AgentLink>(
            AgentLink::Way{[this] { return connect(); }, [this] { return start(); }, [this](pid_t) { ++reaped; }},
            1000ms, agent::Hello{.session = "s", .owner = "o", .wakeCommand = {}}, now);
        link->setListener(self);
    }
    /// Lets time pass, and the link do in it what it will.
    void pass(std::chrono::milliseconds time) {
        onThread();
        for (const auto end = now + time; now < end; now += 10ms) link->proceed(now);
        link->proceed(now);
    }
    void say(agent::Reply reply) {
        peer->send(agent::encode(std::move(reply)));
        EXPECT_TRUE(peer->flush());
        pass(0ms);
    }
    /// The kinds of what the link has sent since the last call.
    std::vector<int> sent() {
        std::vector<int> kinds;
        EXPECT_TRUE(peer->receive());
        while (const auto message = peer->next()) kinds.push_back(message->front());
        return kinds;
    }
    void send(agent::Request request) {
        onThread();
        link->send(std::move(request), now);
        link->proceed(now);
    }

    CapturedLog log;
    AgentLink::Clock::time_point now{1h};
    bool listens = true;
    std::optional<FrameSocket> peer;
    std::string lastWords, heard;
    int starts = 0, reaped = 0;
    const std::shared_ptr<Listener> self{this, [](Listener*) {}};
    std::shared_ptr<AgentLink> link;
};

TEST_F(AgentLinkTest, StartsAnAgentLessAndLessOftenAndComplainsOnceOfWhatItSays) {
    listens = false;
    lastWords = "the journal is of version 99\n";
    open();
    pass(900ms);
    EXPECT_EQ(heard, "");
    EXPECT_TRUE(starts > 2 && starts <= 7 && reaped == starts) << starts;
    pass(200ms);
    EXPECT_EQ(heard, "failed ");
    pass(10'000ms);
    EXPECT_LE(starts, 7) << "a resting link does nothing";
    onThread();
    link->retry(now);
    pass(1100ms);
    EXPECT_EQ(heard, "failed failed ");
    EXPECT_EQ(log.count("inside the process, error=the journal is of version 99"), 1) << "once for each reason";
    link->retry(now);
    listens = true;
    pass(10ms);
    say(agent::Welcome{.version = 1});
    EXPECT_EQ(log.count("error=the agent speaks version 1 of the protocol"), 1);
    link->retry(now);
    say(agent::Welcome{});
    EXPECT_EQ(heard, "failed failed failed ready ");
}

TEST_F(AgentLinkTest, GivesUpAnAgentThatOwesAnAnswerAndAsksASilentOneForASignOfLife) {
    open();
    pass(900ms);
    say(agent::Welcome{});
    EXPECT_EQ(sent(), std::vector<int>{agent::Hello::kind});
    send(agent::Flush{});
    pass(10'000ms);
    EXPECT_EQ(sent(), std::vector<int>{agent::Flush::kind}) << "which takes its time, and nothing is awaited";
    send(agent::Submit{"a"});
    pass(900ms);
    say(agent::Progress{"b", 1, 2});
    pass(900ms);
    say(agent::Accepted{"a"});
    pass(1500ms);
    onThread();
    link->setAwaitsTasks(true);
    pass(600ms);
    EXPECT_EQ(sent(), (std::vector<int>{agent::Submit::kind, agent::Ping::kind}));
    say(agent::Pong{});
    pass(2900ms);
    EXPECT_EQ(heard, std::string("ready FBI"));
    pass(200ms);
    EXPECT_EQ(heard, std::string("ready FBIfailed "));
    EXPECT_EQ(log.count("error=no answer in time"), 1);
}

// Nobody would tell the next session of a completion that was acknowledged here.
TEST(AgentConversation, ACompletionForASessionThatHasJustGoneIsLeftToTheNext) {
    const TemporaryDocuments documents;
    const auto tasks = std::make_shared<TaskTable>();
    const auto reporter = std::make_shared<SessionReporter>(std::weak_ptr<TransferSessionDelegate>(), nullptr);
    const AgentLink::Way nowhere{[] { return Descriptor(); }, [] { return AgentProgram::Started(); }, {}};
    const auto conversation = std::make_shared<AgentConversation>(
        AgentDirectory(documents / "agent"),
        std::make_shared<AgentLink>(nowhere, std::chrono::seconds(1), agent::Hello{}, AgentLink::Clock::now()),
        std::chrono::seconds(1),
        AgentConversation::Session{
            {}, tasks, reporter, std::make_shared<InsideTransfers>(TransferSessionConfiguration{}, reporter, tasks)});
    tasks->close();
    using Task = BackgroundTransferTask;
    const auto late = std::make_shared<Task>(std::weak_ptr<BackgroundTransferCore>(), 1, TransferRequest{}, "body");
    EXPECT_FALSE(tasks->insert(late));
    EXPECT_TRUE(late->advanceTo(Task::Stage::inside));
    EXPECT_FALSE(late->advanceTo(Task::Stage::reporting)) << "no task goes both ways";
    std::promise<bool> isAcknowledged;
    AgentThread::shared().post([&] {
        agentThread.assertCurrent("the test");
        conversation->agentSaid(agent::Completed{"token", {}, encodeOutcome({})});
        isAcknowledged.set_value(Acknowledgements::shared().contains("token"));
    });
    EXPECT_FALSE(isAcknowledged.get_future().get());
}

}  // namespace
}  // namespace corvane::test
