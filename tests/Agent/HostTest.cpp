#include "tests/Agent/AgentFixture.h"
#include "tests/Integration/HostProcess.h"
#include "tests/support/Documents.h"

#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <random>

namespace corvane::test {
namespace {

class HostTest : public AgentFixture {
  protected:
    HostProcess run(const std::string& endpoint, int events, const std::string& mode, const std::string& wake = {}) {
        std::vector<std::string> command{CORVANE_RECORDER,
                                         server.url("/" + endpoint),
                                         documents.path().string(),
                                         "1",
                                         std::to_string(events),
                                         mode,
                                         endpoint,
                                         CORVANE_AGENT};
        if (!wake.empty()) command.push_back(wake);
        return HostProcess::run(command);
    }

    /// The events that arrived, by the path of their endpoint.
    [[nodiscard]] std::multiset<std::string> arrived(const std::string& endpoint) const {
        std::multiset<std::string> found;
        for (const auto& request : server.requests()) {
            if (request.path != "/" + endpoint ||
                std::to_string(request.body.size()) != request.header("Content-Length"))
                continue;
            found.merge(eventIDs({JSON(request.content())}));
        }
        return found;
    }
    [[nodiscard]] std::size_t payloads(const std::string& endpoint) const {
        return filesIn(documents / ("com.veskar.corvane." + endpoint + ".upload-dropbox")).size();
    }
};

TEST_F(HostTest, WhatAKilledHostHandedOverArrivesOnceAndItsNextRunLearnsOfIt) {
    constexpr int count = 200;
    for (const std::string endpoint : {"first", "second"}) {
        const auto before = server.requests().size();
        server.script(ScriptedServer::Reply::status(200).hold(), count);
        const HostProcess killed = run(endpoint, count, "handOver");
        ASSERT_TRUE(killed.wasKilled());
        ASSERT_EQ(killed.acknowledged.size(), static_cast<std::size_t>(count));
        ASSERT_TRUE(server.waitForRequests(before + 4)) << "the agent sends, though nobody is there";
        // The first next run's retry pass comes while most documents have not gone out yet, and leaves them alone; the
        // second one's when all have arrived and nobody has told the host.
        const auto collect = [&] { return run(endpoint, 1, "wait"); };
        auto next = std::async(endpoint == "second" ? std::launch::deferred : std::launch::async, collect);
        server.release(count);
        if (endpoint == "second") {
            ASSERT_TRUE(eventually([&] { return server.requests().size() == before + count; }, 30s));
            EXPECT_EQ(payloads(endpoint), static_cast<std::size_t>(count));
        }
        const HostProcess collected = next.get();
        EXPECT_TRUE(collected.succeeded());
        std::multiset<std::string> expected(killed.acknowledged.begin(), killed.acknowledged.end());
        expected.insert(collected.acknowledged.begin(), collected.acknowledged.end());
        EXPECT_EQ(arrived(endpoint), expected) << "each once";
        EXPECT_EQ(payloads(endpoint), 0u);
    }
}

TEST_F(HostTest, RunsACommandForAHostThatIsNotThereOnce) {
    const auto woken = documents / "woken", program = body("wake", "#!/bin/sh\necho \"$1\" $(umask) $(pwd) >> '" +
                                                                       (documents / "woken").string() + "'\n");
    chmod(program.c_str(), 0700);
    server.script(ScriptedServer::Reply::status(200).hold(), 5);  // a fast server leaves nothing to wake up for
    const HostProcess killed = run("main", 5, "handOver", program);
    ASSERT_TRUE(killed.wasKilled());
    server.release(5);
    ASSERT_TRUE(eventually([&] { return std::filesystem::exists(woken) && !readFile(woken).empty(); }));
    EXPECT_TRUE(run("main", 1, "wait").succeeded()) << "a host that is there is told, not woken";
    FILE* own = popen("umask", "re");
    char mask[8] = {};
    EXPECT_TRUE(fgets(mask, sizeof mask, own) && pclose(own) == 0);
    EXPECT_EQ(readFile(woken), "com.veskar.corvane.upload-session " + std::string(mask, 4) + " /\n");
}

// The fifty rounds: the host's process is the test's, so that it can tell what it was told of.
TEST_F(HostTest, AnAgentThatIsKilledAtAnyMomentLosesNothingAndReportsNothingTwice) {
    std::mt19937 random(7);
    auto session = open(recorder);
    std::size_t submitted = 0;
    for (int round = 0; round < 50; ++round) {
        for (int i = 0; i < 6; ++i) upload(*session, server.url(), std::to_string(submitted++));
        ASSERT_TRUE(eventually([&] { return agent() > 0; }));
        // Not to wait for anything: the kill is to come wherever the agent happens to be.
        std::this_thread::sleep_for(std::chrono::microseconds(random() % 20'000));
        kill(SIGKILL);
        if (round % 10 == 9) {  // the host, too, has a new run now and then
            ASSERT_TRUE(recorder->wait(submitted)) << recorder->outcomes().size() << " of " << submitted;
            EXPECT_TRUE(running(*session).empty());
            session.reset();
            session = open(recorder);
        }
    }
    ASSERT_TRUE(recorder->wait(submitted));
    const auto outcomes = recorder->outcomes();
    EXPECT_EQ(outcomes.size(), submitted);
    for (const auto& [name, outcome] : outcomes) EXPECT_EQ(outcome, "200") << name << ", reported once";
    const auto arrived = bodies(server);
    for (const auto& [name, outcome] : outcomes) EXPECT_TRUE(arrived.contains(name)) << name;
    EXPECT_GT(log.count("Transfer agent was lost and is started again"), 0);
    EXPECT_TRUE(eventually([&] { return running(*session).empty(); }));
}

}  // namespace
}  // namespace corvane::test
