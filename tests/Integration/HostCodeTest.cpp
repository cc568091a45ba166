#include "tests/Integration/Application.h"

#include "tests/support/CapturedLog.h"
#include "tests/support/Documents.h"
#include "tests/support/TemporaryDocuments.h"

#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <stdexcept>
#include <thread>

namespace corvane::test {
namespace {

/// A processor that does the same thing in every callback, and says in which it was.
class EveryCallback final : public EventProcessorType {
  public:
    using Action = std::function<void(const std::string& callback)>;
    explicit EveryCallback(Action action) : action_(std::move(action)) {}

    void registerAccessQueue(std::shared_ptr<SerialQueue>) override {}
    void process(const ProcessEvent&) override { action_("process"); }
    void didEnterGroup(const Group&) override { action_("didEnterGroup"); }
    void didLeaveGroup(const Group&) override { action_("didLeaveGroup"); }
    void didStartSession(const Session&) override { action_("didStartSession"); }
    void didUpdateSession(const Session&, bool) override { action_("didUpdateSession"); }
    void didEndSession(const Session&, Date) override { action_("didEndSession"); }
    bool resumeBackgroundProcessing(const std::string&, const std::function<void()>&) override {
        action_("resumeBackgroundProcessing");
        return false;
    }

  private:
    const Action action_;
};

struct Calling {
    EveryCallback::Action action;
    JSON toDict() const {
        action("session data");
        return JSON("{}");
    }
};

class HostCode : public ::testing::Test {
  protected:
    /// Plugs `action` into everything that takes the host's code, and does everything that calls it; returns when all
    /// of it has run.
    void callEverything(const EveryCallback::Action& action) {
        auto& sessions = application->sessions;
        const auto tracker = sessions.tracker()->chain("child");
        const auto formatter = [action] {
            struct Formatter final : LoggingEventProcessorFormatterType {
                EveryCallback::Action run;
                std::string format(const ProcessEvent&) const override { return run("formatter"), ""; }
            };
            auto made = std::make_shared<Formatter>();
            made->run = action;
            return LoggingEventProcessorFormat::custom(made);
        };
        const auto manager = sessions.processorManager();
        manager->add(std::make_shared<EveryCallback>(action));
        manager->add(std::make_shared<LoggingEventProcessor>(formatter()));
        manager->resumeBackgroundProcessing("another", {});
        const auto observer =
            tracker->onSessionChange([action](AccessTracker&, SessionChange) { action("session observer"); });
        sessions.push(SessionData{"calling", Calling{action}});
        sessions.transaction([action](AccessSessionManager&) { action("session transaction"); });
        tracker->enterGroup("group");
        tracker->submit<ScreenView>([action](const EventSubmitResult&) { action("submit completion"); });
        tracker->leaveGroup();
        // Everything from here on is enqueued too, and the action may release the session manager.
        std::promise<void> done;
        const auto end = [&, action] {
            done.set_value();
            action("end completion");
        };
        sessions.end(end);
        done.get_future().wait();
    }

    /// Waits until everything enqueued so far has run.
    void drain() {
        std::promise<void> drained;
        application->sessions.transaction([&](AccessSessionManager&) { drained.set_value(); });
        drained.get_future().wait();
    }

    CapturedLog log;
    TemporaryDocuments documents;
    ScriptedServer server;
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
    callEverything([&](const std::string& callback) {
        switch (calls++ % 3) {
            case 0:
                throw std::runtime_error("thrown in " + callback);
            case 1:
                throw 7;
            default:
                throw Silent();
        }
    });
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
    callEverything([&](const std::string& callback) {
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
    });
    while (rounds < 100) drain();
    drain();
    application->sessions.endSync();
    EXPECT_EQ(completed, submitted);
    const auto report = application->wait();
    EXPECT_EQ(report.pending, DeliveryReport::Count{});
    EXPECT_EQ(report.givenUp, DeliveryReport::Count{});
    EXPECT_EQ(log.count("Host code failed"), 0);
}

TEST_F(HostCode, MayReleaseTheSessionManagerFromInsideAnyCall) {
    for (const std::string releasing : everyCall) {
        auto sessions = std::make_unique<SessionManager>();
        const auto tracker = sessions->tracker();
        const auto manager = sessions->processorManager();
        const auto release = [&](const std::string& callback) {
            if (callback == releasing) sessions.reset();
        };
        std::promise<void> let, last;
        sessions->transaction([&](AccessSessionManager&) { let.get_future().wait(); });
        manager->add(std::make_shared<EveryCallback>(release));
        const auto child = tracker->chain("child");
        const auto observer =
            child->onSessionChange([&](AccessTracker&, SessionChange) { release("session observer"); });
        sessions->push(SessionData{"calling", Calling{release}});
        sessions->start(Session::Kind::userEvents());
        sessions->push(SessionData{"screen", Screen{"x"}});
        sessions->transaction([&](AccessSessionManager&) { release("session transaction"); });
        manager->resumeBackgroundProcessing("another", {});
        tracker->push(Screen{"home"});
        tracker->enterGroup("group");
        tracker->leaveGroup();
        bool succeeded = false;
        tracker->submit<ScreenView>([&](const EventSubmitResult& result) {
            succeeded = result.succeeded();
            release("submit completion");
        });
        sessions->end([&] { release("end completion"); });
        sessions->transaction([&](AccessSessionManager&) { last.set_value(); });
        let.set_value();
        last.get_future().wait();
        EXPECT_TRUE(succeeded) << "what was called before the release reaches everybody: " << releasing;
        EXPECT_FALSE(sessions) << releasing;
        std::promise<bool> late;
        tracker->submit<ScreenView>([&](const EventSubmitResult& result) { late.set_value(result.succeeded()); });
        EXPECT_FALSE(late.get_future().get()) << releasing;
    }
}

TEST_F(HostCode, MayBlockWithoutHoldingUpTheHostsCalls) {
    for (const std::string blocking : everyCall) {
        std::promise<void> entered, release;
        std::shared_future<void> released(release.get_future());
        std::atomic<bool> once = false;
        std::thread host([&] {
            callEverything([&](const std::string& callback) {
                if (callback != blocking || once.exchange(true)) return;
                entered.set_value();
                released.wait();
            });
        });
        entered.get_future().wait();
        const auto tracker = application->sessions.tracker()->chain("other");
        std::promise<void> submitted;
        for (int i = 0; i < 100; ++i) {
            tracker->push(Screen{"x"}, {DataEventTrait::unique});
            tracker->submit<ScreenView>();
        }
        application->sessions.start(Session::Kind::userEvents());
        tracker->submit<ScreenView>([&](const EventSubmitResult&) { submitted.set_value(); });
        EXPECT_NE(submitted.get_future().wait_for(0s), std::future_status::ready) << "it was not blocked at all";
        release.set_value();
        host.join();
        drain();
        application = std::make_unique<Application>(server.url());
        application->wait();  // its files are made now, and not when the test's directory has gone
    }
}

}  // namespace
}  // namespace corvane::test
