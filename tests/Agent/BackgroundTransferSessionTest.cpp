#include <corvane/Testing/ProcessSettings.h>

#include "tests/Agent/AgentFixture.h"
#include "tests/Integration/Application.h"

#include <signal.h>
#include <unistd.h>

namespace corvane::test {
namespace {

using Reply = ScriptedServer::Reply;
using Outcomes = std::map<std::string, std::string>;

constexpr const char* waits = "Uploads wait for their server";
constexpr const char* nowhere = "http://127.0.0.1:1/";

class BackgroundTransferSessionTest : public AgentFixture {};

TEST_F(BackgroundTransferSessionTest, UploadsThroughTheAgentAndTasksOutliveTheirSession) {
    server.script(Reply::status(201));
    server.script(Reply::status(503));
    server.script(Reply::status(200).hold(), 2);
    auto session = open(recorder);
    upload(*session, server.url("/a"), "a");
    ASSERT_TRUE(recorder->wait(1));
    const auto before = recorder->bytesSent.load();
    upload(*session, server.url("/b"), "b");
    ASSERT_TRUE(recorder->wait(2));
    EXPECT_EQ(recorder->bytesSent - before, 1);
    EXPECT_EQ(recorder->outcomes(), (Outcomes{{"a", "201"}, {"b", "503"}}));
    const auto request = server.requests().at(0);
    EXPECT_EQ(request.method + request.header("X-Task") + request.body, "PUTaa");
    for (const auto* name : {"c", "d"}) upload(*session, server.url(), name);
    ASSERT_TRUE(server.waitForRequests(4));
    session.reset();

    auto next = std::make_shared<SessionRecorder>();
    session = open(next);
    EXPECT_EQ(running(*session), (std::vector<std::string>{"c", "d"}));
    session->deliverPendingEvents();
    EXPECT_EQ(next->waitForSignal(), 0u) << "nothing is pending yet";
    session.reset();
    server.release(2);
    next = std::make_shared<SessionRecorder>();
    session = open(next);
    ASSERT_TRUE(next->wait(2));
    EXPECT_EQ(next->outcomes(), (Outcomes{{"c", "200"}, {"d", "200"}}));
    session->deliverPendingEvents();
    EXPECT_EQ(next->waitForSignal(), 2u);
    EXPECT_EQ(recorder->outcomes().size() + server.requests().size(), 6u) << "the first session had gone";
}

TEST_F(BackgroundTransferSessionTest, RefusesBodiesThatAreNoFilesOfTheUser) {
    auto session = open(recorder);
    std::filesystem::create_symlink(body("file"), documents / "link");
    std::vector<std::filesystem::path> cases{documents / "missing", documents / "link", "/dev/null"};
    if (geteuid() == 0 && chown(body("foreign").c_str(), 1, 1) == 0) cases.push_back(documents / "foreign");
    for (const auto& one : cases) session->uploadTask({.url = server.url(), .headers = {}}, one)->resume();
    ASSERT_TRUE(recorder->wait(cases.size()));
    EXPECT_EQ(recorder->outcomes()["none"].find_first_not_of("bodyUnavailable"), std::string::npos);
    EXPECT_TRUE(server.requests().empty());
}

TEST_F(BackgroundTransferSessionTest, TransfersInsideTheProcessWhenNoAgentCanBeHad) {
    options.deadline = 300ms;
    for (const std::string program : {"/nowhere/agent", "/bin/false", "/bin/true"}) {
        const auto told = std::make_shared<SessionRecorder>();
        const int before = log.count("Transfer agent is not available");
        options.program = program;
        auto session = open(told, program == "/bin/true" ? std::string(9000, 'o') : "owner");
        upload(*session, server.url(), "a");
        EXPECT_TRUE(told->wait(1)) << program;
        EXPECT_EQ(told->outcomes(), (Outcomes{{"a", "200"}})) << program;
        EXPECT_TRUE(running(*session).empty());
        session->deliverPendingEvents();
        EXPECT_TRUE(told->waitForSignal());
        EXPECT_EQ(log.count("Transfer agent is not available"), before + 1) << program;
        EXPECT_EQ(files("spool"), 0u) << "no agent will send it again";
    }
    EXPECT_EQ(server.requests().size(), 3u);
    EXPECT_EQ(log.count("the owner key is longer than 8192 bytes"), 1);
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
    EXPECT_TRUE(running(*session).empty() && recorder->outcomes().empty()) << "it was reported";
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
    session.reset();
    end(options.directory);
    const auto told = std::make_shared<SessionRecorder>();
    session = open(told);
    ASSERT_TRUE(told->wait(10));
    EXPECT_EQ(told->outcomes().size(), 10u);
    session.reset();
    end(options.directory);

    std::filesystem::remove(options.directory / "journal.db-wal");
    writeFile(options.directory / "journal.db", std::string(8192, 'x'));
    session = open(recorder);
    upload(*session, server.url(), "after");
    ASSERT_TRUE(recorder->wait(1));
    EXPECT_EQ(log.count("Transfer agent reports a problem"), 1);
}

TEST_F(BackgroundTransferSessionTest, TakesTheProxyOfWhoeverHandsTheUploadOver) {
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
    EXPECT_TRUE(log.waitFor("Uploads to a server go on, server=collector.test:"));
    EXPECT_EQ(log.count("secret"), 0);
}

TEST_F(BackgroundTransferSessionTest, EveryHostOfAnOwnerHearsOfTheEnd) {
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

TEST_F(BackgroundTransferSessionTest, WaitsForAServerWhileThereIsAHostAndThePatienceLasts) {
    options.patienceWithoutHost = 200ms;
    auto session = open(recorder);
    upload(*session, nowhere, "a");
    ASSERT_TRUE(log.waitFor(waits));
    options.patience = 100ms;
    const auto other = std::make_shared<SessionRecorder>();
    auto impatient = open(other, "impatient");
    upload(*impatient, nowhere, "b");
    ASSERT_TRUE(other->wait(1));
    EXPECT_EQ(other->outcomes(), (Outcomes{{"b", "unreachable"}}));
    impatient.reset();
    const auto first = agent();
    EXPECT_FALSE(eventually([&] { return agent() != first; }, 400ms)) << "it stays for its host";
    session.reset();
    ASSERT_TRUE(eventually([&] { return agent() == 0; }));
    session = open(recorder);
    EXPECT_EQ(running(*session), std::vector<std::string>{"a"});
    EXPECT_TRUE(eventually([&] { return log.count(waits) == 3; })) << "and it goes on";
}

TEST_F(BackgroundTransferSessionTest, TellsAnObserverOfProgressAndAWaitingHostOfAServerThatIsNotThere) {
    ProcessSettings settings;
    settings.setTransfers(BackgroundTransferSession::factory(options));
    Log::shared().setLevel(LogLevel::error);  // which wants no progress of its own
    const auto soon = std::chrono::steady_clock::now() + 20s;
    std::mutex mutex;
    std::vector<DeliveryUpdate> heard;
    const auto observer = [&](const DeliveryUpdate& update) {
        const std::lock_guard lock(mutex);
        heard.push_back(update);
    };
    {
        Application application(server.url(), 50, "there", observer);
        for (const int delivered : {1, 2}) {  // the agent may be through with the first before it knows its host
            application.submit();
            application.uploads->flush();
            EXPECT_EQ(application.uploads->waitForDelivery(soon).delivered.events, delivered);
        }
        MainQueue::async([] { Log::shared().error("behind what was waited for"); });
        ASSERT_TRUE(log.waitFor("behind what was waited for"));
    }
    using Step = DeliveryUpdate::Step;
    ASSERT_GE(heard.size(), 5u);
    const auto* const second = &*heard.end() - 3;
    EXPECT_TRUE(second[0].step == Step::underWay && second[1].step == Step::progress);
    EXPECT_EQ(second[1].bytesSent, std::ssize(server.requests().at(1).body));
    EXPECT_TRUE(second[2].step == Step::delivered && second[2].cause.status == 200);

    Application application(nowhere, 1, "nowhere");
    application.submit();
    for (const int count : {1, 2}) {  // the agent says it once, and holds the second up, too
        const auto report =
            application.uploads->waitForDelivery(soon + std::chrono::hours(1), {.onlyWhileReachable = true});
        EXPECT_EQ(report.pending.documents, count);
        application.submit();
    }
    EXPECT_EQ(log.count(waits), 1);
}

}  // namespace
}  // namespace corvane::test
