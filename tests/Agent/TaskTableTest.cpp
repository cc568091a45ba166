#include <corvane/Agent/Host/Acknowledgements.h>
#include <corvane/Agent/Host/BackgroundTransferCore.h>
#include <corvane/Agent/OutcomeCodec.h>

#include "tests/support/Testing.h"

namespace corvane::test {
namespace {

using Task = BackgroundTransferTask;
using Stage = Task::Stage;

std::shared_ptr<Task> add(TaskTable& table, Stage stage) {
    auto made = std::make_shared<Task>(std::weak_ptr<BackgroundTransferCore>(), table.nextIdentifier(),
                                       TransferRequest{}, "body");
    EXPECT_TRUE(table.insert(made));
    made->advanceTo(stage);
    return made;
}

TEST(TaskTable, ATaskOnlyGoesForwardAndOneWayToItsEnd) {
    for (int from = 0; from <= static_cast<int>(Stage::completed); ++from) {
        for (int to = 0; to <= static_cast<int>(Stage::completed); ++to) {
            TaskTable table;
            const auto task = add(table, Stage(from));
            const bool isAhead = from < to && !(Stage(from) == Stage::inside && Stage(to) == Stage::reporting);
            EXPECT_EQ(task->advanceTo(Stage(to)), isAhead) << from << " to " << to;
            EXPECT_EQ(task->stage(), Stage(isAhead ? to : from));
        }
    }
}

TEST(TaskTable, KeepsWhatWasToldUntilItIsRemovedAndNothingOpenOnceItIsClosed) {
    TaskTable table;
    const auto open = add(table, Stage::inside), told = add(table, Stage::completed);
    EXPECT_EQ(table.open(), TaskTable::Tasks{open});
    EXPECT_TRUE(table.find(told->token()) == told && !table.isAgentAwaited());
    const auto spooled = add(table, Stage::spooled);
    EXPECT_TRUE(table.isAgentAwaited());
    table.close();
    EXPECT_EQ(spooled->state(), TransferTask::State::completed);
    EXPECT_FALSE(table.find(open->token()) || table.insert(open));
    EXPECT_EQ(table.completedTokens(), std::vector<std::string>{told->token()});
    table.remove(told->token());
    EXPECT_TRUE(table.completedTokens().empty());
}

TEST(AgentThreadDeathTest, ItsStateIsForItAlone) {
    EXPECT_DEATH(agentThread.assertCurrent("this"), "this must run on the agent thread");
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
