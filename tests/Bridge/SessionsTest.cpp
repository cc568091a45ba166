#include "tests/Bridge/BridgeFixture.h"

namespace corvane::test {
namespace {

class BridgeSessions : public BridgeTest {};

TEST_F(BridgeSessions, KindsAndNamesGoBothWays) {
    using Name = std::optional<std::string>;
    const std::tuple<int, Name, Name> cases[] = {
        {0, "ignored", {}}, {1, {}, {}}, {2, {}, {}}, {3, "kiosk", "kiosk"}, {3, {}, ""}};
    for (const auto& [kind, name, seen] : cases) {
        sessions->endSession();
        EXPECT_TRUE(sessions->startSessionForKind(static_cast<CVSessionKind>(kind), name));
        const CVSession session(processor->sessions().back());
        EXPECT_EQ(static_cast<int>(session.kind()), kind);
        EXPECT_EQ(session.name(), seen);
        EXPECT_EQ(session.sessionData()["sessionID"].string(), session.identifier());
    }
}

TEST_F(BridgeSessions, SessionDataOfOneClassSharesAStack) {
    sessions->pushSessionData({"device", raw("Device", {{"model", "M1"}})});
    sessions->pushSessionData({"user", raw("User", {{"id", 7}})}, {.onlyOnce = true}, true);
    sessions->pushSessionData({"user2", raw("User", {{"id", 8}})}, {.onlyOnce = true});
    sessions->endSession();
    sessions->startSessionForKind(CVSessionKind::userEvents);
    EXPECT_EQ(processor->history(),
              (std::vector<std::string>{"start", "update", "update+submit", "update", "end", "start"}));
    const auto dataOf = [&](std::size_t i) {
        const std::string text = processor->sessions().at(i).sessionData.text();
        return text.substr(text.find(',') + 1);
    };
    EXPECT_EQ(dataOf(2), R"("device":{"model":"M1"},"user":{"id":7}})");
    EXPECT_EQ(dataOf(3), R"("device":{"model":"M1"},"user2":{"id":8}})") << "the newer one of a class hides the older";
    EXPECT_EQ(dataOf(5), R"("device":{"model":"M1"},"user":{"id":7}})");
}

TEST_F(BridgeSessions, HandlesWorkInTheirBlockAndRefuseElsewhere) {
    std::shared_ptr<CVAccessSessionManager> keptManager;
    std::shared_ptr<CVAccessTracker> keptTracker;
    const CVRawEvent view{"View", {{"s", {"Screen", optional}}}};
    const auto screen = raw("Screen", {{"n", 1}});
    std::string outcome;
    sessions->transaction([&](const auto& access) {
        keptManager = access;
        EXPECT_TRUE(access->isActive());
        EXPECT_TRUE(access->pushSessionData({"screen", screen}));
        EXPECT_EQ(processor->history().back(), "update") << "done when it returns";
    });
    root->transactionWithBlock([&](const auto& access) {
        keptTracker = access;
        EXPECT_TRUE(access->pushDataEvent(screen));
        EXPECT_TRUE(access->timeRawEvent(view));
        access->submitRawEvent(view, true, keep(outcome));
        EXPECT_EQ(outcome, R"({"s":{"n":1}})") << "done when it returns";
        EXPECT_TRUE(access->popDataEventByName("Screen"));
        EXPECT_FALSE(access->pushDataEvent(nullptr));
    });
    processor->settle();

    CapturedLog log;
    CVError error;
    const std::string off = "Corvane.BridgeError 4: the tracker's handle was used outside the block";
    EXPECT_FALSE(keptManager->isActive());
    EXPECT_FALSE(keptManager->pushSessionData({"screen", screen}, {}, false, &error));
    EXPECT_EQ(error.code(), BridgeError::wrongQueue);
    keptTracker->submitRawEvent(view, false, keep(outcome));
    EXPECT_TRUE(outcome.starts_with("! " + off)) << outcome;
    keptTracker->submitEventType(eventClass("V", {}));
    for (const bool done :
         {keptTracker->timeEventType(eventClass("V", {}), false, &error),
          keptTracker->timeRawEvent(view, false, &error), keptTracker->pushDataEvent(screen, {}, &error),
          keptTracker->pushDataEvent(screen, {}, "f", 1, &error),
          keptTracker->popDataEventType(CVDataEventClass("Screen"), &error)}) {
        EXPECT_FALSE(done);
        EXPECT_TRUE(describe(error).starts_with(off));
    }
    sessions->transaction([&](const auto&) {
        EXPECT_FALSE(keptManager->pushSessionData({"screen", screen})) << "in another block";
        keptTracker->submitRawEvent(view, false, keep(outcome));
    });
    processor->settle();
    EXPECT_EQ(outcome, "{}") << "a tracker's handle is good in every block";
    const auto token = root->delayedSubmitRawEvent(view);
    sessions.reset();
    EXPECT_EQ(submit(root, view), "! Corvane.TrackerError 1: there is no active session");
    token->commit();
    processor->settle();
}

TEST_F(BridgeSessions, ObserversAreToldUntilTheirObjectGoes) {
    std::vector<CVSessionChange> changes;
    std::string late;
    auto owner = std::make_shared<int>();
    root->onSessionChangeWithBlock([&](const auto& access, CVSessionChange change) {
            changes.push_back(change);
            if (change == CVSessionChange::willEnd) access->submitRawEvent({"Bye", {}}, false, keep(late));
        })
        ->disposeOnObject(owner);
    int blocks = 0;
    root->onSessionChangeWithBlock([&](const auto&, CVSessionChange) { FAIL(); })->disposeOnObject(processor);
    root->removeSessionObserversForObject(processor);
    root->whenSession([&](const auto&) { ++blocks; });
    sessions->endSession();
    root->whenSession([&](const auto&) { ++blocks; });
    processor->settle();
    EXPECT_EQ(changes, (std::vector{CVSessionChange::willEnd, CVSessionChange::didEnd}));
    EXPECT_EQ(late, "{}");
    EXPECT_EQ(blocks, 1);
    owner.reset();
    for (int session = 0; session < 2; ++session) {
        sessions->startSessionForKind(CVSessionKind::userEvents);
        sessions->endSession();
    }
    processor->settle();
    EXPECT_EQ(changes.size(), 2u);
    EXPECT_EQ(blocks, 2);
}

}  // namespace
}  // namespace corvane::test
