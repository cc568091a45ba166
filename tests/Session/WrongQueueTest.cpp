#include <corvane/Processing/UploadBatchEntity.h>
#include <corvane/Processing/UploadBatchEventProcessor.h>
#include <corvane/Session/SessionCore.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Store/DeferredStoreCore.h>

#include "tests/support/TemporaryDocuments.h"
#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

/// Each operation that must run on a queue, called on another thread or on a queue that it would wait for. (What
/// stands here besides is tested beside its class: endSync, waitForDelivery and the queue's own operations.)
class WrongQueueDeathTest : public TrackingTest {
  protected:
    WrongQueueDeathTest() { GTEST_FLAG_SET(death_test_style, "threadsafe"); }

    static std::string mustRun(const std::string& operation) {
        return operation + " must run on queue com.veskar.corvane.event-tracker";
    }

    const std::shared_ptr<SessionCore> core = SessionCore::make();
    const Session session{"S", Session::Kind::userEvents(), Date(), JSON("{}")};
};

TEST_F(WrongQueueDeathTest, HandlesOnTrackers) {
    const AccessTracker access(root);
    EXPECT_DEATH(access.submit<ScreenView>(), mustRun("Tracker submission"));
    EXPECT_DEATH(access.time<Played>(), mustRun("Tracker timer"));
    EXPECT_DEATH(access.push(Screen{}), mustRun("Tracker push"));
    EXPECT_DEATH(access.pop<Screen>(), mustRun("Tracker pop"));
}

TEST_F(WrongQueueDeathTest, HandlesOnSessionManagers) {
    AccessSessionManager access(core);
    EXPECT_DEATH((void)access.isActive(), mustRun("SessionManager activeSession"));
    EXPECT_DEATH(access.push(SessionData{"screen", Screen{}}), mustRun("SessionManager push"));
}

TEST_F(WrongQueueDeathTest, DeliveriesToProcessors) {
    ProcessorManager& manager = *sessions->processorManager();
    EXPECT_DEATH(manager.process(ProcessEvent("E", JSON("{}"), {})), mustRun("process"));
    EXPECT_DEATH(manager.didStartSession(session), mustRun("didStartSession"));

    TemporaryDocuments documents;
    UploadBatchEventProcessor uploads({"com.example.app", "App", "1", 1}, Endpoint("http://127.0.0.1:9", "main"));
    EXPECT_DEATH(uploads.didEndSession(session, now()), "didEndSession of an upload processor that was never added");
    uploads.registerAccessQueue(core->accessQueue());
    EXPECT_NO_THROW(uploads.registerAccessQueue(core->accessQueue())) << "added twice, to one manager";
    EXPECT_THROW(sessions->processorManager()->add({std::shared_ptr<void>(), &uploads}), InvalidArgument);
    EXPECT_DEATH(uploads.process(ProcessEvent("E", JSON("{}"), {})), mustRun("UploadBatchEventProcessor::process"));
}

TEST_F(WrongQueueDeathTest, TheDatabaseFromItsOwnQueue) {
    DeferredStore<UploadBatchEntity> rows(std::nullopt);
    const auto nothing = [](Store<UploadBatchEntity>&) {};
    EXPECT_DEATH(rows.perform([&](Store<UploadBatchEntity>&) { rows.perform(nothing); }),
                 "would wait for itself, queue=com.veskar.corvane.deferred-store.queue");
    const auto store = DeferredStoreCore::make(Store<UploadBatchEntity>::table(), 0, std::nullopt);
    EXPECT_DEATH((void)store->connection(),
                 "DeferredStoreCore::connection must run on queue com.veskar.corvane.deferred-store.queue");
}

}  // namespace
}  // namespace corvane::test
