#include "tests/Integration/Application.h"

#include "tests/support/Documents.h"
#include "tests/support/TemporaryDocuments.h"

#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <optional>
#include <thread>

namespace corvane::test {
namespace {

using Reply = ScriptedServer::Reply;

class Lifetime : public ::testing::Test {
  protected:
    /// What this run leaves on disk, the next one delivers: exactly `events` distinct ones.
    void expectDeliveredByTheNextRun(std::size_t events) {
        ScriptedServer healthy;
        Application next(healthy.url());
        EXPECT_EQ(next.wait().pending, DeliveryReport::Count{});
        const auto arrived = eventIDs(documentsAt(healthy));
        EXPECT_EQ(std::set<std::string>(arrived.begin(), arrived.end()).size(), events);
    }

    TemporaryDocuments documents;
    ScriptedServer server;
};

TEST_F(Lifetime, ASessionManagerReleasedDuringAnUploadLeavesItForTheNextRun) {
    server.script(Reply::never(), 10);
    for (const bool elsewhere : {false, true}) {
        std::optional<Application> application(std::in_place, server.url(), 2);
        application->submit(4);
        ASSERT_TRUE(server.waitForRequests(elsewhere ? 4 : 2));
        if (elsewhere) {
            std::thread([&] { application.reset(); }).join();
        } else {
            application.reset();
        }
    }
    expectDeliveredByTheNextRun(8);
}

TEST_F(Lifetime, AProcessorReleasedInMidUploadLeavesItsDocumentsForTheNextOne) {
    server.script(Reply::status(200).hold(), 4);
    SessionManager sessions;
    sessions.start(Session::Kind::userEvents());
    sessions.tracker()->push(Screen{"home"});
    for (int round = 0; round < 2; ++round) {
        auto uploads = std::make_shared<UploadBatchEventProcessor>(Client{"com.example.player", "Player", "2.3", 117},
                                                                   Endpoint{server.url(), "other"},
                                                                   UploadBatchEventConfig(1, false));
        sessions.processorManager()->add(uploads);
        sessions.tracker()->submit<ScreenView>();
        ASSERT_TRUE(server.waitForRequests(round == 0 ? 1 : 3)) << "the second one finds the first one's document";
        if (round == 1) {
            server.release(3);
            const auto report = uploads->waitForDelivery(std::chrono::steady_clock::now() + 20s);
            EXPECT_EQ(report.delivered.documents, 2);
        }
        sessions.processorManager()->remove(uploads);
        std::weak_ptr<UploadBatchEventProcessor> gone = uploads;
        uploads.reset();
        std::promise<void> removed;
        sessions.transaction([&](AccessSessionManager&) { removed.set_value(); });
        removed.get_future().wait();
        EXPECT_TRUE(gone.expired());
    }
}

TEST_F(Lifetime, WhatTheHostKeepsStaysHarmlessWhenEverythingElseHasGone) {
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
    const auto late = child->onSessionChange([&](AccessTracker&, SessionChange) { ++changes; });
    late->disposeOn(observer);
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
