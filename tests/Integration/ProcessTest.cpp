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

    /// Runs a host whose events all are acknowledged, to the end that its mode has.
    void record(const ScriptedServer& at, const std::string& mode, int batchSize, int events, std::size_t more = 0) {
        HostProcess host = run(at, mode, batchSize, events);
        // One that waits beside another has nothing to retry where that one has finished a document.
        const bool endedWell = mode == "kill" ? host.wasKilled() : mode == "wait" || host.succeeded();
        EXPECT_TRUE(endedWell) << mode << " " << host.status;
        const bool mayLeaveEarly = mode == "exit" || mode == "quit";
        EXPECT_TRUE(mayLeaveEarly || host.acknowledged.size() == events + more) << host.acknowledged.size();
        const std::lock_guard lock(mutex);
        acknowledged.merge(host.acknowledged);
    }
    /// Once a last host has sent what the others left.
    void expectAllArrived() {
        EXPECT_TRUE(run(server, "wait", 50, 1).succeeded());
        const auto arrived = eventIDs(server.documents());
        EXPECT_TRUE(std::includes(arrived.begin(), arrived.end(), acknowledged.begin(), acknowledged.end()))
            << acknowledged.size() << " acknowledged, " << arrived.size() << " arrived";
    }

    TemporaryDocuments documents;
    ScriptedServer server;
    std::mutex mutex;
    std::set<std::string> acknowledged;
};

TEST_F(Process, NoAcknowledgedEventIsLostWhenItIsKilled) {
    ScriptedServer stalled;
    stalled.script(ScriptedServer::Reply::never(), 100);
    // An open batch only; full batches that are under way; a mixture of both.
    for (const auto& [batchSize, events] : {std::pair{50, 7}, {5, 20}, {4, 31}}) {
        record(stalled, "kill", batchSize, events);
    }
    expectAllArrived();
}

TEST_F(Process, ExitsCleanlyWithWorkPendingAndLosesNothing) {
    for (const std::string mode : {"exit", "quit"}) {
        for (int round = 0; round < 5; ++round) record(server, mode, 5, 50);
    }
    expectAllArrived();
}

TEST_F(Process, TwoAtOnceOnOneEndpointLoseNothing) {
    for (int round = 0; round < 6; ++round) {
        // The first run of both, at the same moment; later with what the others left.
        const bool isReady = round > 3 || run(server, "wait", 50, 1).succeeded();
        EXPECT_TRUE(isReady);
        if (round < 3) std::filesystem::remove_all(documents.path());
        const auto other = std::async(std::launch::async, [&] { record(server, "kill", 4, 31); });
        record(server, round % 2 ? "kill" : "wait", 5, 42);
    }
    EXPECT_EQ(acknowledged.size(), 6u * (31 + 42));
    expectAllArrived();
}

TEST_F(Process, StaticObjectsMayUseTheLibraryInTheirDestructors) {
    // The event of the destructor, too, and none without a manager.
    for (int round = 0; round < 5; ++round) record(server, "static", 5, 50, 1);
    expectAllArrived();
}

TEST_F(Process, GoesOnAfterAForkAndItsChildrenEndCleanlyAndSendNothing) {
    record(server, "fork", 1, 200);
    EXPECT_EQ(eventIDs(server.documents()).size(), 200u) << "each once";
    expectAllArrived();
}

}  // namespace
}  // namespace corvane::test
