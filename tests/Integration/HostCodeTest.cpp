#include "tests/Integration/FaultFixture.h"

#include <corvane/Tracker/SessionObserver.h>

namespace corvane::test {
namespace {

/// A processor that does the same thing in every callback, and says in which it was.
struct EveryCallback final : EventProcessorType {
    using Action = std::function<void(const std::string& callback)>;
    explicit EveryCallback(Action given) : action(std::move(given)) {}

    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {}
    void process(const ProcessEvent&) override { action("process"); }
    void didEnterGroup(const Group&) override { action("didEnterGroup"); }
    void didLeaveGroup(const Group&) override { action("didLeaveGroup"); }
    void didStartSession(const Session&) override { action("didStartSession"); }
    void didUpdateSession(const Session&, bool) override { action("didUpdateSession"); }
    void didEndSession(const Session&, Date) override { action("didEndSession"); }
    bool resumeBackgroundProcessing(const std::string&, const std::function<void()>&) override {
        action("resumeBackgroundProcessing");
        return false;
    }
    const Action action;
};

struct Calling {
    EveryCallback::Action action;
    JSON toDict() const {
        action("session data");
        return JSON("{}");
    }
};

class HostCode : public ::testing::Test, protected FaultFixture {
  protected:
    /// Plugs `action` into everything that takes the host's code, and does everything that calls it while the queue
    /// waits; then the queue goes on. Ready when all of it has run. The action may release `sessions`.
    std::future<void> callEverything(SessionManager& sessions, const EveryCallback::Action& action) {
        std::promise<void> let;
        sessions.transaction([let = let.get_future().share()](AccessSessionManager&) { let.wait(); });
        const auto tracker = sessions.tracker()->chain("child");
        const auto manager = sessions.processorManager();
        manager->add(std::make_shared<EveryCallback>(action));
        manager->resumeBackgroundProcessing("another", {});
        const auto observer =
            tracker->onSessionChange([action](AccessTracker&, SessionChange) { action("session observer"); });
        observer->disposeOn(manager);
        sessions.push(SessionData{"calling", Calling{action}});
        sessions.start(Session::Kind::userEvents());
        sessions.push(SessionData{"screen", Screen{"x"}});
        sessions.transaction([action](AccessSessionManager&) { action("session transaction"); });
        tracker->push(Screen{"home"});
        tracker->enterGroup("group");
        tracker->submit<ScreenView>([action](const EventSubmitResult& result) {
            EXPECT_TRUE(result.succeeded());
            action("submit completion");
        });
        tracker->leaveGroup();
        sessions.end([action] { action("end completion"); });
        const auto done = std::make_shared<std::promise<void>>();
        sessions.transaction([done](AccessSessionManager&) { done->set_value(); });
        let.set_value();
        return done->get_future();
    }

    std::unique_ptr<Application> application = std::make_unique<Application>(server.url());
};

const char* const everyCall[] = {
    "process",          "didEnterGroup",       "didLeaveGroup",     "didStartSession",
    "didUpdateSession", "didEndSession",       "session data",      "resumeBackgroundProcessing",
    "session observer", "session transaction", "submit completion", "end completion"};

TEST_F(HostCode, MayThrowAnythingEverywhereAndHurtsNobodyElse) {
    struct Silent final : std::exception {
        [[nodiscard]] const char* what() const noexcept override { return nullptr; }
    };
    std::atomic<int> calls = 0;
    callEverything(application->sessions, [&](const std::string& callback) {
        switch (calls++ % 3) {
            case 0:
                throw std::runtime_error("thrown in " + callback);
            case 1:
                throw 7;
            default:
                throw Silent();
        }
    }).wait();
    EXPECT_EQ(application->wait().delivered, (DeliveryReport::Count{1, 1}));
    for (const std::string call : everyCall) {
        EXPECT_TRUE(log.waitFor("Host code failed, call=" + call + ", error=")) << call;
    }
    EXPECT_GE(log.count("error=an exception that is not a std::exception"), 3);
    EXPECT_GE(log.count("error=an exception without a message"), 3);
}

TEST_F(HostCode, MayUseEverythingElseFromInside) {
    std::atomic<int> rounds = 0, submitted = 0, completed = 0;
    const auto tracker = application->sessions.tracker();
    const auto manager = application->sessions.processorManager();
    const auto extra = std::make_shared<LoggingEventProcessor>();
    callEverything(application->sessions, [&](const std::string& callback) {
        // What this starts calls it again, so it does so for a while only.
        if (++rounds > 100) return;
        auto& sessions = application->sessions;
        manager->add(extra);
        manager->remove(extra);
        sessions.start(Session::Kind::telemetry());
        sessions.push(SessionData{"inside", Screen{callback}}, {}, true);
        sessions.end();
        sessions.start(Session::Kind::userEvents());
        tracker->onSessionChange([](AccessTracker& access, SessionChange) { access.submit<ScreenView>(); });
        ++submitted;
        tracker->submit<ScreenView>([&](const EventSubmitResult&) { ++completed; });
        tracker->removeSessionObservers(tracker);
        tracker->suspend();
        tracker->resume();
    }).wait();
    while (rounds < 100) application->drain();
    application->drain();
    application->sessions.endSync();
    EXPECT_EQ(completed, submitted);
    const auto report = application->wait();
    EXPECT_EQ(report.pending, DeliveryReport::Count{});
    EXPECT_EQ(report.givenUp, DeliveryReport::Count{});
    EXPECT_EQ(log.count("Host code failed"), 0);
}

TEST_F(HostCode, MayReleaseTheSessionManagerFromInsideAnyCall) {
    for (const std::string releasing : everyCall) {
        SCOPED_TRACE(releasing);
        auto sessions = std::make_unique<SessionManager>();
        const auto tracker = sessions->tracker();
        // What was called before the release reaches everybody.
        callEverything(*sessions, [&](const std::string& callback) {
            if (callback == releasing) sessions.reset();
        }).wait();
        EXPECT_FALSE(sessions);
        std::promise<bool> late;
        tracker->submit<ScreenView>([&](const EventSubmitResult& result) { late.set_value(result.succeeded()); });
        EXPECT_FALSE(late.get_future().get());
    }
}

}  // namespace
}  // namespace corvane::test
