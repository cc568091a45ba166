#include "tests/support/Documents.h"
#include "tests/support/Testing.h"

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <sstream>

namespace corvane::test {
namespace {

struct Outcome {
    int status;                          ///< as waitpid gives it
    std::set<std::string> acknowledged;  ///< the identifiers of events whose submission succeeded
};

class Process : public ::testing::Test {
  protected:
    Outcome run(const ScriptedServer& at, const std::string& mode, int batchSize, int events) {
        int channel[2];
        EXPECT_EQ(pipe(channel), 0);
        const std::string batch = std::to_string(batchSize), count = std::to_string(events), url = at.url("/in");
        const pid_t child = fork();
        if (child == 0) {
            // It ends in the midst of work, and its forked children have none of its threads: what a thread holds while
            // it starts or ends, or held on a stack that is no more, would be taken for leaked.
            setenv("ASAN_OPTIONS", "detect_leaks=0", 1);
            dup2(channel[1], STDOUT_FILENO);
            close(channel[0]);
            close(channel[1]);
            execl(CORVANE_RECORDER, CORVANE_RECORDER, url.c_str(), documents.path().c_str(), batch.c_str(),
                  count.c_str(), mode.c_str(), nullptr);
            _exit(127);
        }
        close(channel[1]);
        std::string output;
        std::array<char, 4096> buffer;
        for (ssize_t n = 0; (n = read(channel[0], buffer.data(), buffer.size())) > 0;) output.append(buffer.data(), n);
        close(channel[0]);
        Outcome result{};
        waitpid(child, &result.status, 0);
        std::istringstream lines(output);
        for (std::string line; std::getline(lines, line);) result.acknowledged.insert(line);
        return result;
    }

    void expectAllArrived(const std::set<std::string>& acknowledged) {
        const auto arrived = eventIDs(server.documents());
        const std::set<std::string> distinct(arrived.begin(), arrived.end());
        EXPECT_TRUE(std::includes(distinct.begin(), distinct.end(), acknowledged.begin(), acknowledged.end()))
            << acknowledged.size() << " acknowledged, " << distinct.size() << " distinct arrived";
    }

    TemporaryDocuments documents;
    ScriptedServer server;
};

TEST_F(Process, NoAcknowledgedEventIsLostWhenItIsKilled) {
    std::set<std::string> acknowledged;
    ScriptedServer stalled;
    stalled.script(ScriptedServer::Reply::never(), 100);
    // An open batch only; full batches that are under way; a mixture of both.
    for (const auto& [batchSize, events] : {std::pair{50, 7}, {5, 20}, {4, 31}}) {
        const Outcome killed = run(stalled, "kill", batchSize, events);
        ASSERT_TRUE(WIFSIGNALED(killed.status) && WTERMSIG(killed.status) == SIGKILL);
        EXPECT_EQ(killed.acknowledged.size(), static_cast<std::size_t>(events));
        acknowledged.insert(killed.acknowledged.begin(), killed.acknowledged.end());
    }
    const Outcome last = run(server, "wait", 50, 1);
    EXPECT_TRUE(WIFEXITED(last.status) && WEXITSTATUS(last.status) == 0);
    EXPECT_EQ(acknowledged.size(), 7u + 20u + 31u);
    expectAllArrived(acknowledged);
}

TEST_F(Process, ExitsCleanlyWithWorkPendingAndLosesNothing) {
    std::set<std::string> acknowledged;
    for (const std::string mode : {"exit", "quit"}) {
        for (int round = 0; round < 5; ++round) {
            const Outcome left = run(server, mode, 5, 50);
            EXPECT_TRUE(WIFEXITED(left.status) && WEXITSTATUS(left.status) == 0) << mode << " " << left.status;
            acknowledged.insert(left.acknowledged.begin(), left.acknowledged.end());
        }
    }
    EXPECT_EQ(WEXITSTATUS(run(server, "wait", 50, 1).status), 0);
    expectAllArrived(acknowledged);
}

TEST_F(Process, TwoAtOnceOnOneEndpointLoseNothing) {
    std::set<std::string> acknowledged;
    for (int round = 0; round < 6; ++round) {
        if (round == 3) {  // from here on with what the others left
            EXPECT_EQ(WEXITSTATUS(run(server, "wait", 50, 1).status), 0);
        } else if (round < 3) {  // the first run of both, at the same moment
            EXPECT_EQ(WEXITSTATUS(run(server, "wait", 50, 1).status), 0);
            std::filesystem::remove_all(documents.path());
        }
        auto other = std::async(std::launch::async, [&] { return run(server, "kill", 4, 31); });
        const auto one = run(server, round % 2 ? "kill" : "wait", 5, 42).acknowledged;
        acknowledged.insert(one.begin(), one.end());
        acknowledged.merge(other.get().acknowledged);
    }
    EXPECT_EQ(acknowledged.size(), 6u * (31 + 42));
    EXPECT_EQ(WEXITSTATUS(run(server, "wait", 50, 1).status), 0);
    expectAllArrived(acknowledged);
}

TEST_F(Process, StaticObjectsMayUseTheLibraryInTheirDestructors) {
    std::set<std::string> acknowledged;
    for (int round = 0; round < 5; ++round) {
        const Outcome left = run(server, "static", 5, 50);
        EXPECT_TRUE(WIFEXITED(left.status) && WEXITSTATUS(left.status) == 0) << left.status;
        EXPECT_EQ(left.acknowledged.size(), 51u) << "the one of the destructor too, and none without a manager";
        acknowledged.insert(left.acknowledged.begin(), left.acknowledged.end());
    }
    EXPECT_EQ(WEXITSTATUS(run(server, "wait", 50, 1).status), 0);
    expectAllArrived(acknowledged);
}

TEST_F(Process, GoesOnAfterAForkAndItsChildrenEndCleanlyAndSendNothing) {
    const Outcome forked = run(server, "fork", 1, 200);
    EXPECT_TRUE(WIFEXITED(forked.status) && WEXITSTATUS(forked.status) == 0) << forked.status;
    EXPECT_EQ(forked.acknowledged.size(), 200u);
    expectAllArrived(forked.acknowledged);
    EXPECT_EQ(eventIDs(server.documents()).size(), 200u) << "each once";
}

}  // namespace
}  // namespace corvane::test
