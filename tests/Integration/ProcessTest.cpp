#include "tests/Integration/HostProcess.h"
#include "tests/support/Documents.h"
#include "tests/support/Testing.h"

namespace corvane::test {
namespace {

class Process : public ::testing::Test {
  protected:
    HostProcess run(const ScriptedServer& at, const std::string& mode, int batchSize, int events) {
        return HostProcess::run({CORVANE_RECORDER, at.url("/in"), documents.path().string(), std::to_string(batchSize),
                                 std::to_string(events), mode});
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
        const HostProcess killed = run(stalled, "kill", batchSize, events);
        ASSERT_TRUE(killed.wasKilled());
        EXPECT_EQ(killed.acknowledged.size(), static_cast<std::size_t>(events));
        acknowledged.insert(killed.acknowledged.begin(), killed.acknowledged.end());
    }
    const HostProcess last = run(server, "wait", 50, 1);
    EXPECT_TRUE(last.succeeded());
    EXPECT_EQ(acknowledged.size(), 7u + 20u + 31u);
    expectAllArrived(acknowledged);
}

TEST_F(Process, ExitsCleanlyWithWorkPendingAndLosesNothing) {
    std::set<std::string> acknowledged;
    for (const std::string mode : {"exit", "quit"}) {
        for (int round = 0; round < 5; ++round) {
            const HostProcess left = run(server, mode, 5, 50);
            EXPECT_TRUE(left.succeeded()) << mode << " " << left.status;
            acknowledged.insert(left.acknowledged.begin(), left.acknowledged.end());
        }
    }
    EXPECT_TRUE(run(server, "wait", 50, 1).succeeded());
    expectAllArrived(acknowledged);
}

TEST_F(Process, TwoAtOnceOnOneEndpointLoseNothing) {
    std::set<std::string> acknowledged;
    for (int round = 0; round < 6; ++round) {
        if (round == 3) {  // from here on with what the others left
            EXPECT_TRUE(run(server, "wait", 50, 1).succeeded());
        } else if (round < 3) {  // the first run of both, at the same moment
            EXPECT_TRUE(run(server, "wait", 50, 1).succeeded());
            std::filesystem::remove_all(documents.path());
        }
        auto other = std::async(std::launch::async, [&] { return run(server, "kill", 4, 31); });
        const auto one = run(server, round % 2 ? "kill" : "wait", 5, 42).acknowledged;
        acknowledged.insert(one.begin(), one.end());
        acknowledged.merge(other.get().acknowledged);
    }
    EXPECT_EQ(acknowledged.size(), 6u * (31 + 42));
    EXPECT_TRUE(run(server, "wait", 50, 1).succeeded());
    expectAllArrived(acknowledged);
}

TEST_F(Process, StaticObjectsMayUseTheLibraryInTheirDestructors) {
    std::set<std::string> acknowledged;
    for (int round = 0; round < 5; ++round) {
        const HostProcess left = run(server, "static", 5, 50);
        EXPECT_TRUE(left.succeeded()) << left.status;
        EXPECT_EQ(left.acknowledged.size(), 51u) << "the one of the destructor too, and none without a manager";
        acknowledged.insert(left.acknowledged.begin(), left.acknowledged.end());
    }
    EXPECT_TRUE(run(server, "wait", 50, 1).succeeded());
    expectAllArrived(acknowledged);
}

TEST_F(Process, GoesOnAfterAForkAndItsChildrenEndCleanlyAndSendNothing) {
    const HostProcess forked = run(server, "fork", 1, 200);
    EXPECT_TRUE(forked.succeeded()) << forked.status;
    EXPECT_EQ(forked.acknowledged.size(), 200u);
    expectAllArrived(forked.acknowledged);
    EXPECT_EQ(eventIDs(server.documents()).size(), 200u) << "each once";
}

}  // namespace
}  // namespace corvane::test
