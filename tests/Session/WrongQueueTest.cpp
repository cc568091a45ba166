#include <corvane/Processing/UploadBatchEntity.h>
#include <corvane/Processing/UploadBatchEventProcessor.h>
#include <corvane/Session/SessionCore.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Store/DeferredStoreCore.h>

#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

using WrongQueueDeathTest = TrackingTest;

TEST_F(WrongQueueDeathTest, NothingRunsWhereItWouldRaceOrWaitForItself) {
    const std::string tracking = " queue com.veskar.corvane.event-tracker";
    const std::string storing = "com.veskar.corvane.deferred-store.queue";
    const std::string must = " must run on" + tracking, mustNot = " must not be called on" + tracking;
    const AccessTracker access(root);
    const auto core = SessionCore::make();
    AccessSessionManager session(core);
    ProcessorManager& manager = *sessions->processorManager();
    TemporaryDocuments documents;
    const Client client{"com.example.app", "App", "1", 1};
    const Endpoint endpoint("http://127.0.0.1:9", "main");
    UploadBatchEventProcessor uploads(client, endpoint), neverAdded(client, endpoint);
    uploads.registerAccessQueue(core->accessQueue());
    EXPECT_NO_THROW(uploads.registerAccessQueue(core->accessQueue())) << "added twice, to one manager";
    EXPECT_THROW(manager.add({std::shared_ptr<void>(), &uploads}), InvalidArgument);
    const ProcessEvent event("E", JSON("{}"), {});
    const Session ended{"S", Session::Kind::userEvents(), Date(), JSON("{}")};
    DeferredStore<UploadBatchEntity> rows(std::nullopt);
    const auto store = DeferredStoreCore::make(Store<UploadBatchEntity>::table(), 0, std::nullopt);
    const auto nothing = [](Store<UploadBatchEntity>&) {};
    const std::pair<std::function<void()>, std::string> elsewhere[] = {
        {[&] { access.submit<ScreenView>(); }, "Tracker submission" + must},
        {[&] { access.time<Played>(); }, "Tracker timer" + must},
        {[&] { access.push(Screen{}); }, "Tracker push" + must},
        {[&] { access.pop<Screen>(); }, "Tracker pop" + must},
        {[&] { (void)session.isActive(); }, "SessionManager activeSession" + must},
        {[&] {
             session.push(SessionData{"screen", Screen{}});
         },
         "SessionManager push" + must},
        {[&] { manager.process(event); }, "process" + must},
        {[&] { manager.didStartSession(ended); }, "didStartSession" + must},
        {[&] { uploads.process(event); }, "UploadBatchEventProcessor::process" + must},
        {[&] { neverAdded.didEndSession(ended, now()); }, "didEndSession of an upload processor that was never added"},
        {[&] { (void)store->connection(); }, "DeferredStoreCore::connection must run on queue " + storing},
        {[&] { rows.perform([&](auto&) { rows.perform(nothing); }); }, "would wait for itself, queue=" + storing},
    };
    for (const auto& [call, message] : elsewhere) EXPECT_DEATH(call(), message);
    const std::pair<std::function<void()>, std::string> onTheQueue[] = {
        {[&] { sessions->endSync(); }, "SessionManager::endSync" + mustNot},
        {[&] { (void)root->snapshot(SnapshotPolicy::now); }, "Tracker::snapshot" + mustNot},
        {[&] { (void)uploads.waitForDelivery({}); }, "waitForDelivery" + mustNot},
    };
    for (const auto& [call, message] : onTheQueue) {
        const auto inside = [&, call = call](AccessSessionManager&) { call(); };
        EXPECT_DEATH((sessions->transaction(inside), core->accessQueue()->sync(call), processor->settle()), message);
    }
}

}  // namespace
}  // namespace corvane::test
