#include "tests/Agent/AgentFixture.h"

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Agent/AgentMessage.h>
#include <corvane/Agent/FrameSocket.h>

#include <poll.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cstdlib>
#include <thread>

namespace corvane::test {
namespace {

using Reply = ScriptedServer::Reply;
using Outcomes = std::map<std::string, std::string>;

class BackgroundTransferSessionTest : public AgentFixture {};

TEST_F(BackgroundTransferSessionTest, UploadsThroughTheAgentAndForgetsWhatWasReported) {
    server.script(Reply::status(201));
    server.script(Reply::status(503));
    auto session = open(recorder);
    upload(*session, server.url("/a"), "a");
    ASSERT_TRUE(recorder->wait(1));
    const auto before = recorder->bytesSent();
    upload(*session, server.url("/b"), "b");
    ASSERT_TRUE(recorder->wait(2));
    EXPECT_EQ(recorder->bytesSent() - before, 1);
    EXPECT_EQ(recorder->outcomes(), (Outcomes{{"a", "201"}, {"b", "503"}}));
    const auto requests = server.requests();
    EXPECT_EQ(requests.at(0).method, "PUT");
    EXPECT_EQ(requests.at(0).header("X-Task"), "a");
    EXPECT_EQ(requests.at(0).body, "a");
    EXPECT_TRUE(running(*session).empty());
    EXPECT_GT(agent(), 0) << "it was the agent that sent them";
    EXPECT_EQ(log.count("agent"), 0);
}

TEST_F(BackgroundTransferSessionTest, TasksOutliveTheirSessionAndAreReportedOnceToTheNext) {
    server.script(Reply::status(200).hold(), 3);
    auto first = open(recorder);
    for (const auto* name : {"a", "b", "c"}) upload(*first, server.url(), name);
    ASSERT_TRUE(server.waitForRequests(3));
    first.reset();

    auto second = std::make_shared<SessionRecorder>();
    auto session = open(second);
    EXPECT_EQ(running(*session), (std::vector<std::string>{"a", "b", "c"}));
    session->deliverPendingEvents();
    ASSERT_TRUE(second->waitForSignal()) << "nothing is pending yet";
    EXPECT_EQ(second->completedAtSignal(), 0u);
    session.reset();
    server.release(3);
    second = std::make_shared<SessionRecorder>();
    session = open(second);
    ASSERT_TRUE(second->wait(3));
    EXPECT_EQ(second->outcomes(), (Outcomes{{"a", "200"}, {"b", "200"}, {"c", "200"}}));
    session->deliverPendingEvents();
    ASSERT_TRUE(second->waitForSignal());
    EXPECT_EQ(second->completedAtSignal(), 3u);
    EXPECT_TRUE(running(*session).empty());
    EXPECT_TRUE(recorder->outcomes().empty()) << "its session had gone";
    EXPECT_EQ(server.requests().size(), 3u);
}

TEST_F(BackgroundTransferSessionTest, OwnersSeeTheirOwnTasksOnly) {
    server.script(Reply::status(200).hold(), 2);
    const auto other = std::make_shared<SessionRecorder>();
    auto mine = open(recorder, "mine");
    auto theirs = open(other, "theirs");
    upload(*mine, server.url(), "a");
    upload(*theirs, server.url(), "b");
    ASSERT_TRUE(server.waitForRequests(2));
    EXPECT_EQ(running(*mine), std::vector<std::string>{"a"});
    EXPECT_EQ(running(*theirs), std::vector<std::string>{"b"});
    server.release(2);
    ASSERT_TRUE(recorder->wait(1) && other->wait(1));
    EXPECT_EQ(recorder->outcomes(), (Outcomes{{"a", "200"}}));
    EXPECT_EQ(other->outcomes(), (Outcomes{{"b", "200"}}));
}

TEST_F(BackgroundTransferSessionTest, RefusesBodiesThatAreNoFilesOfTheUser) {
    auto session = open(recorder);
    const auto file = body("file");
    std::filesystem::create_symlink(file, documents / "link");
    ASSERT_EQ(mkfifo((documents / "pipe").c_str(), 0600), 0);
    std::vector<std::filesystem::path> cases{documents / "missing", documents.path(), documents / "link",
                                             documents / "pipe", "/dev/null"};
    if (geteuid() == 0 && chown(body("foreign").c_str(), 1, 1) == 0) cases.push_back(documents / "foreign");
    Outcomes expected;
    for (const auto& one : cases) {
        const auto task = session->uploadTask({.url = server.url(), .headers = {}}, one);
        task->setDescription(one.string());
        task->resume();
        expected[one.string()] = "bodyUnavailable";
    }
    ASSERT_TRUE(recorder->wait(cases.size()));
    EXPECT_EQ(recorder->outcomes(), expected);
    EXPECT_TRUE(server.requests().empty());
}

TEST_F(BackgroundTransferSessionTest, WaitsForAServerThatIsNotThereYetUntilItsPatienceIsOver) {
    LatePort late;
    const LatePort never;
    auto session = open(recorder);
    upload(*session, late.url(), "late");
    options.patience = 100ms;
    const auto other = std::make_shared<SessionRecorder>();
    auto impatient = open(other, "impatient");
    for (const auto* name : {"a", "b", "c"}) upload(*impatient, never.url(), name);
    ASSERT_TRUE(other->wait(3));
    EXPECT_EQ(other->outcomes(), (Outcomes{{"a", "unreachable"}, {"b", "unreachable"}, {"c", "unreachable"}}));
    EXPECT_EQ(running(*session), std::vector<std::string>{"late"});
    auto second = open(std::make_shared<SessionRecorder>());
    EXPECT_EQ(running(*second), std::vector<std::string>{"late"});
    EXPECT_EQ(log.count("Uploads wait for their server"), 3) << "once for each host and session, also a later one";
    late.answerOne();
    ASSERT_TRUE(recorder->wait(1));
    EXPECT_EQ(recorder->outcomes(), (Outcomes{{"late", "200"}}));
    EXPECT_TRUE(log.waitFor("Uploads to a server go on, server=127.0.0.1:"));
}

TEST_F(BackgroundTransferSessionTest, TransfersInsideTheProcessWhenNoAgentCanBeHad) {
    const auto broken = body("broken", "no program");
    chmod(broken.c_str(), 0700);
    options.deadline = 300ms;
    const std::filesystem::path programs[] = {"/nowhere/agent", broken, "/bin/false", "/bin/true"};
    for (const auto& program : programs) {
        const auto told = std::make_shared<SessionRecorder>();
        const int before = log.count("Transfer agent is not available");
        options.program = program;
        auto session = open(told);
        upload(*session, server.url(), "a");
        EXPECT_TRUE(told->wait(1)) << program;
        EXPECT_EQ(told->outcomes(), (Outcomes{{"a", "200"}})) << program;
        EXPECT_TRUE(running(*session).empty());
        session->deliverPendingEvents();
        EXPECT_TRUE(told->waitForSignal());
        EXPECT_EQ(log.count("Transfer agent is not available"), before + 1) << program;
        EXPECT_EQ(files("spool"), 0u) << "no agent will send it again";
    }
    EXPECT_EQ(server.requests().size(), 4u);
    auto session = open(recorder, std::string(9000, 'o'));
    upload(*session, server.url(), "too long a name");
    EXPECT_TRUE(recorder->wait(1));
    EXPECT_EQ(log.count("the owner key is longer than 8192 bytes"), 1);
}

TEST_F(BackgroundTransferSessionTest, GoesBackToTheAgentOnceOneOfAnEarlierVersionHasGone) {
    const AgentDirectory directory(options.directory);
    Descriptor listener = directory.listen();
    std::atomic<bool> stops = false;
    std::thread earlier([&] {  // says which version it speaks, and hangs up
        while (!stops) {
            pollfd polled{listener.get(), POLLIN, 0};
            poll(&polled, 1, 10);
            Descriptor connected(accept(listener.get(), nullptr, nullptr));
            if (!connected) continue;
            FrameSocket socket(std::move(connected));
            socket.send(agent::encode(agent::Welcome{.version = 1}));
            EXPECT_TRUE(socket.flush());
        }
    });
    options.holdOff = 0ms;
    auto session = open(recorder);
    for (std::size_t i = 0; i < 5; ++i) {
        upload(*session, server.url(), std::to_string(i));
        ASSERT_TRUE(recorder->wait(i + 1));
    }
    EXPECT_EQ(log.count("the agent speaks version 1 of the protocol"), 1) << "not once for each task";
    stops = true;
    earlier.join();
    listener = Descriptor();
    directory.removeSocket();
    upload(*session, server.url(), "5");
    ASSERT_TRUE(recorder->wait(6));
    EXPECT_TRUE(running(*session).empty());
    EXPECT_GT(agent(), 0);
    EXPECT_EQ(server.requests().size(), 6u);
}

TEST_F(BackgroundTransferSessionTest, LeavesAMarkForTheAgentThatItCannotTellBeforeItsProcessExits) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    if (const char* shared = std::getenv("CORVANE_TEST_DIRECTORY")) options.directory = shared;
    setenv("CORVANE_TEST_DIRECTORY", options.directory.c_str(), 1);
    // The child exits while its server is at work.
    const char* sanitizer = std::getenv("TSAN_OPTIONS");
    setenv("TSAN_OPTIONS", (std::string(sanitizer ? sanitizer : "") + " report_thread_leaks=0").c_str(), 1);
    EXPECT_EXIT(
        {
            // The agent is killed while the delegate is told, and none can be started: the journal has the end, and
            // nobody hears that it was reported.
            options.program = documents / "program";
            std::filesystem::create_symlink(CORVANE_AGENT, options.program);
            recorder->whenCompleted = [this] {
                std::filesystem::remove(options.program);
                end(options.directory);
            };
            static auto& session = *new auto(open(recorder));
            upload(*session, server.url(), "a");
            const bool completed = recorder->wait(1) && running(*session).empty();
            std::filesystem::remove_all(documents.path());
            std::exit(completed ? 0 : 1);
        },
        testing::ExitedWithCode(0), "");
    unsetenv("CORVANE_TEST_DIRECTORY");
    auto session = open(recorder);
    EXPECT_TRUE(running(*session).empty());
    EXPECT_TRUE(recorder->outcomes().empty()) << "it was reported";
}

TEST_F(BackgroundTransferSessionTest, TakesOverFromAnAgentThatHangsWhichThenLeavesTheTasksAlone) {
    options.deadline = 300ms;
    options.holdOff = 0ms;
    auto session = open(recorder);
    server.script(Reply::status(200).hold(), 4);  // the agent has four under way, and others wait
    const auto name = [](int i) { return "task " + std::to_string(i); };
    for (int i = 0; i < 8; ++i) upload(*session, server.url(), name(i));
    ASSERT_TRUE(server.waitForRequests(4));
    kill(SIGSTOP);
    for (int i = 8; i < 12; ++i) upload(*session, server.url(), name(i));
    ASSERT_TRUE(recorder->wait(12));
    EXPECT_EQ(recorder->outcomes().size(), 12u);
    EXPECT_EQ(log.count("Transfer agent is not available"), 1);
    kill(SIGCONT);
    server.release(4);
    upload(*session, server.url(), name(12));
    ASSERT_TRUE(recorder->wait(13));
    EXPECT_TRUE(running(*session).empty());
    EXPECT_EQ(recorder->outcomes()[name(12)], "200");
    const auto arrived = bodies(server);
    EXPECT_EQ(arrived.size(), 13u);
    for (int i = 4; i < 13; ++i) EXPECT_EQ(arrived.at(name(i)), 1) << i << ": was not under way";
    EXPECT_TRUE(eventually([&] { return files("withdrawn") == 0 && files("spool") == 0; }));
}

TEST_F(BackgroundTransferSessionTest, GoesOnWithAJournalThatSurvivesItsAgentOrIsDamaged) {
    server.script(Reply::never(), 4);
    auto session = open(recorder);
    for (int i = 0; i < 10; ++i) upload(*session, server.url(), std::to_string(i));
    ASSERT_TRUE(server.waitForRequests(4));
    EXPECT_EQ(running(*session).size(), 10u);
    kill(SIGKILL);
    ASSERT_TRUE(recorder->wait(10));
    for (const auto& [name, outcome] : recorder->outcomes()) EXPECT_EQ(outcome, "200") << name;
    EXPECT_EQ(log.count("Transfer agent was lost"), 1);
    session.reset();
    end(options.directory);

    std::filesystem::remove(options.directory / "journal.db-wal");
    writeFile(options.directory / "journal.db", std::string(8192, 'x'));
    const auto told = std::make_shared<SessionRecorder>();
    session = open(told);
    upload(*session, server.url(), "after");
    ASSERT_TRUE(told->wait(1));
    EXPECT_EQ(log.count("Transfer agent reports a problem"), 1);
    EXPECT_TRUE(std::filesystem::exists(options.directory / "journal.db.damaged"));
}

}  // namespace
}  // namespace corvane::test
