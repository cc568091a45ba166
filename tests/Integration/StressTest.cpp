#include "tests/Integration/Application.h"
#include "tests/support/Testing.h"

#include <random>

namespace corvane::test {
namespace {

struct Level {
    int value;
};
struct Watched {
    EventProperty<TimedData> span = required;
};

TEST(Stress, EveryOperationFromManyThreadsAtOnceLosesNoCompletion) {
    constexpr int threads = 6, operationsPerThread = 250;
    TemporaryDocuments documents;
    ScriptedServer server;
    std::atomic<int> submitted = 0, completed = 0;
    {
        CapturedLog log;
        Application application(server.url(), 20);
        auto& sessions = application.sessions;
        const auto root = sessions.tracker();
        const auto manager = sessions.processorManager();
        const auto count = [&](const EventSubmitResult&) { ++completed; };

        const auto work = [&](unsigned seed) {
            std::minstd_rand random(seed);
            auto tracker = root->chain("thread " + std::to_string(seed));
            std::vector<std::shared_ptr<SessionObserver>> observers;
            const auto logging = std::make_shared<LoggingEventProcessor>();
            const std::function<void()> operations[] = {
                [&] { ++submitted, tracker->submit<ScreenView>(count); },
                [&] { ++submitted, tracker->explicitSubmit<ScreenView>(now(), count); },
                [&] { ++submitted, root->submit<Watched>(count); },
                [&] { tracker->submit<Watched>({.onlyIfTimed = true}); },
                [&] { tracker->time<Watched>(true); },
                [&] { root->explicitTime<Watched>(now()); },
                [&] { tracker->push(Screen{"there"}, {DataEventTrait::onlyOnce}); },
                [&] { root->push(Level{1}, {DataEventTrait::unique}); },
                [&] { tracker->pop<Screen>(), root->pop<Level>(); },
                [&] { tracker->transaction([](AccessTracker& access) { access.push(Screen{"inside"}); }); },
                [&] { ++submitted, tracker->delayedSubmit<ScreenView>(count)->commit(); },
                [&] { tracker->enterGroup("group"); },
                [&] { tracker->leaveGroup(); },
                [&] { tracker = (tracker->path().size() > 5 ? root : tracker)->chain("link"); },
                [&] {
                    observers.push_back(tracker->onSessionChange([](AccessTracker& access, SessionChange) {
                        access.push(Screen{"seen"});
                        access.submit<ScreenView>();
                    }));
                },
                [&] {
                    if (!observers.empty()) observers.back()->disposeOn(logging);
                },
                [&] { observers.clear(), tracker->removeSessionObservers(tracker); },
                [&] { tracker->suspend(), root->resume(); },
                [&] { sessions.start(Session::Kind::custom("stress")); },
                [&] { sessions.end(); },
                [&] { sessions.endSync(); },
                [&] {
                    sessions.push(SessionData{"level", Level{2}}, {DataEventTrait::onlyOnce}, true);
                },
                [&] {
                    sessions.transaction([](AccessSessionManager& access) {
                        if (access.isActive()) access.push(SessionData{"screen", Screen{"inside"}});
                    });
                },
                [&] { manager->add(logging); },
                [&] { manager->remove(logging); },
                [&] { manager->add(application.uploads), manager->remove(application.uploads); },
                [&] { manager->add(application.uploads); },
                [&] { manager->resumeBackgroundProcessing("another", [] {}); },
                [&] { (void)application.uploads->waitForDelivery(std::chrono::steady_clock::now()); },
                [&] {
                    Log::shared().setLevel(LogLevel::debug), Log::shared().setSink([](LogLevel, std::string_view) {});
                },
                [&] { Log::shared().setLevel(LogLevel::error); },
            };
            std::uniform_int_distribution<std::size_t> pick(0, std::size(operations) - 1);
            for (int i = 0; i < operationsPerThread; ++i) operations[pick(random)]();
        };
        std::vector<std::thread> workers;
        for (unsigned seed = 1; seed <= threads; ++seed) workers.emplace_back(work, seed);
        for (auto& worker : workers) worker.join();
        sessions.endSync();
        (void)application.wait();
    }
    EXPECT_GT(submitted, 100);
    EXPECT_EQ(completed, submitted);
}

}  // namespace
}  // namespace corvane::test
