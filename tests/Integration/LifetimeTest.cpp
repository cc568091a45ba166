#include "tests/Integration/Application.h"

#include "tests/support/Documents.h"
#include "tests/support/Testing.h"

namespace corvane::test {
namespace {

TEST(Lifetime, WhatTheHostKeepsStaysHarmlessWhenEverythingElseHasGone) {
    TemporaryDocuments documents;
    ScriptedServer server;
    auto application = std::make_unique<Application>(server.url());
    const auto root = application->sessions.tracker();
    auto child = root->chain("child");
    const auto manager = application->sessions.processorManager();
    const auto uploads = application->uploads;
    std::atomic<int> changes = 0;
    const auto observer = root->onSessionChange([&](AccessTracker&, SessionChange) { ++changes; });
    application->submit(3);
    application->sessions.endSync();
    application.reset();

    AccessTracker handle(child);
    child->onSessionChange([&](AccessTracker&, SessionChange) { ++changes; })->disposeOn(observer);
    root->removeSessionObservers(root);
    root->suspend();
    root->resume();
    manager->add(std::make_shared<LoggingEventProcessor>());
    manager->remove(uploads);
    manager->resumeBackgroundProcessing("another", {});
    const auto grandchild = child->chain("grandchild");
    grandchild->push(Screen{"x"});
    grandchild->enterGroup("g");
    grandchild->leaveGroup();
    grandchild->time<ScreenView>(true);
    grandchild->whenSession([&](AccessTracker&) { ++changes; });
    grandchild->delayedSubmit<ScreenView>()->commit();
    EXPECT_FALSE(grandchild->snapshot(SnapshotPolicy::now)->evaluate<Screen>().entries.size());
    std::promise<std::string> outcome;
    grandchild->submit<ScreenView>([&](const EventSubmitResult& result) { outcome.set_value(result.error()->what()); });
    EXPECT_EQ(outcome.get_future().get(), "there is no active session");
    observer->notify(SessionChange::didStart);
    EXPECT_EQ(changes, 3) << "the two of the session's end, and the host's own call";
    child.reset();
    EXPECT_TRUE(handle.tracker()) << "its child holds it";
    EXPECT_EQ(uploads->waitForDelivery(std::chrono::steady_clock::now() + 20s).delivered.events, 3);
}

}  // namespace
}  // namespace corvane::test
