#include "tests/support/TrackingFixture.h"

namespace corvane::test {
namespace {

class Lifetime : public TrackingTest {
  protected:
    struct Mark {};
};

TEST_F(Lifetime, EverythingCalledBeforeDestructionStillReachesTheProcessorsWhereverItHappens) {
    for (const std::string way : {"here", "another thread", "a completion", "suspended"}) {
        const auto recorder = std::make_shared<RecordingProcessor>();
        auto manager = std::make_unique<SessionManager>();
        const auto tracker = manager->tracker();
        manager->processorManager()->add(recorder);
        manager->start(Session::Kind::userEvents());
        std::promise<void> release, started;
        std::unique_ptr<AccessSessionManager> kept;  // which holds what the manager was made of
        manager->transaction([&](AccessSessionManager& access) {
            kept = std::make_unique<AccessSessionManager>(access);
            started.set_value();
            release.get_future().wait();
        });
        started.get_future().wait();
        std::atomic<int> succeeded = 0, failed = 0;
        const auto count = [&](const EventSubmitResult& result) { ++(result.succeeded() ? succeeded : failed); };
        for (int i = 0; i < 10000; ++i) {
            tracker->submit<Mark>([&, i](const EventSubmitResult& result) {
                count(result);
                if (i == 100 && way == "a completion") manager.reset();
            });
        }
        if (way == "here") manager.reset();
        if (way == "another thread") std::thread([&] { manager.reset(); }).join();
        if (way == "suspended") {
            tracker->suspend();
            tracker->suspend();
            std::thread([&] { manager.reset(); }).join();
            tracker->resume();
            tracker->suspend();
        }
        if (way != "a completion") tracker->submit<Mark>(count);
        release.set_value();
        recorder->settle();
        recorder->settle();  // behind the end of the manager too
        EXPECT_EQ(succeeded, 10000) << way;
        EXPECT_EQ(failed, way == "a completion" ? 0 : 1) << way;
        EXPECT_EQ(recorder->events().size(), 10000u) << way;
        EXPECT_EQ(recorder->history().back(), "process Mark") << "no session is ended behind the host's back";
    }
}

}  // namespace
}  // namespace corvane::test
