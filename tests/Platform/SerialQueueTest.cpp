#include <corvane/Platform/SerialQueue.h>

#include <sys/resource.h>
#include <unistd.h>

#include "tests/support/Testing.h"

namespace corvane {
namespace {

TEST(SerialQueue, RunsTasksInOrderFromManyThreadsWithoutOverlap) {
    SerialQueue queue("test");
    constexpr int threads = 4, each = 5000;
    std::vector<int> last(threads, -1);
    int inside = 0;
    bool ordered = true;
    std::atomic<std::uint64_t> mostWaiting = 0;
    std::vector<std::thread> callers;
    for (int t = 0; t < threads; ++t) {
        callers.emplace_back([&, t] {
            for (int i = 0; i < each; ++i) {
                queue.async([&, t, i] {
                    ordered = ordered && ++inside == 1 && last[t] == i - 1;
                    last[t] = i;
                    --inside;
                });
                if (i % 500 == 0) queue.sync([&] { ordered = ordered && last[t] == i; });
                mostWaiting = std::max(mostWaiting.load(), queue.waitingCount());
            }
        });
    }
    for (auto& caller : callers) caller.join();
    queue.sync([] {});
    EXPECT_TRUE(ordered);
    EXPECT_EQ(last, std::vector<int>(threads, each - 1));
    EXPECT_LE(mostWaiting, threads * (each + 1)) << "never below nothing";
    EXPECT_EQ(queue.waitingCount(), 0u);
}

TEST(SerialQueue, SyncReturnsResultsAndRethrowsOnBothPaths) {
    SerialQueue queue("test");
    const auto caller = std::this_thread::get_id();
    EXPECT_EQ(queue.sync([] { return std::this_thread::get_id(); }), caller) << "an idle queue needs no thread switch";
    EXPECT_THROW(queue.sync([] { throw std::runtime_error("x"); }), std::runtime_error);
    std::promise<void> release;
    queue.async([&] { release.get_future().wait(); });
    std::jthread releaser([&] { release.set_value(); });
    EXPECT_EQ(queue.sync([] { return 7; }), 7);
    queue.async([] {});
    EXPECT_THROW(queue.sync([]() -> int { throw std::runtime_error("x"); }), std::runtime_error);
}

/// Notes what a queue does, in order.
class Notes {
  public:
    /// Enqueues a task of a run that leaves a write and a report to its end.
    void inRun(const std::string& name) {
        queue.asyncInRun([this, name] {
            text += name;
            queue.atEndOfRun(SerialQueue::RunEnd::report, [this, name] { text += "!" + name; });
            queue.atEndOfRun(SerialQueue::RunEnd::write, [this, name] { text += "=" + name; });
        });
    }
    [[nodiscard]] Task note(const std::string& name) {
        return [this, name] { text += name; };
    }
    void drain() {
        queue.sync([] {});
    }

    SerialQueue queue{"test"};
    std::string text;
};

TEST(SerialQueue, ARunEndsOnceBeforeAnythingElseASuspensionToo) {
    Notes notes;
    std::promise<void> suspended;
    notes.queue.suspend();
    notes.inRun("a");
    notes.inRun("b");
    notes.queue.async(notes.note("x"));
    notes.inRun("c");
    notes.queue.asyncInRun([&] {
        notes.queue.suspend();
        notes.queue.atEndOfRun(SerialQueue::RunEnd::report, [&] { suspended.set_value(); });
    });
    notes.inRun("d");
    notes.queue.resume();
    suspended.get_future().wait();
    EXPECT_EQ(notes.text, "ab=a=b!a!bxc=c!c") << "reports follow writes";
    notes.queue.resume();
    notes.drain();
    EXPECT_EQ(notes.text, "ab=a=b!a!bxc=c!cd=d!d");

    notes.text.clear();
    const auto leave = [&] {
        notes.queue.atEndOfRun(SerialQueue::RunEnd::report, notes.note("r"));
        throw std::runtime_error("x");
    };
    EXPECT_THROW(notes.queue.sync(leave), std::runtime_error);
    EXPECT_EQ(notes.text, "r");
}

TEST(SerialQueue, ALongRunEndsOnTheWayAndAReportRunsNoOtherInsideOfIt) {
    Notes notes;
    int waiting = 0, most = 0;
    notes.queue.suspend();
    for (int i = 0; i < 2000; ++i) {
        notes.queue.asyncInRun([&] {
            most = std::max(most, ++waiting);
            notes.queue.atEndOfRun(SerialQueue::RunEnd::report, [&] { --waiting; });
        });
    }
    notes.queue.resume();
    notes.drain();
    EXPECT_LE(most, 512);

    notes.queue.sync([&] {
        notes.queue.atEndOfRun(SerialQueue::RunEnd::report, [&] {
            notes.text += "(";
            notes.queue.atEndOfRun(SerialQueue::RunEnd::write, notes.note("w"));
            notes.queue.endRun();
            notes.text += ")";
        });
        notes.queue.atEndOfRun(SerialQueue::RunEnd::report, notes.note("r"));
    });
    EXPECT_EQ(notes.text, "(w)r");
}

TEST(SerialQueue, TasksAheadOvertakeOthersKeepTheirOrderAndObeySuspensions) {
    Notes notes;
    std::promise<void> suspended;
    notes.queue.suspend();
    notes.queue.async(notes.note("a"));
    notes.inRun("b");
    notes.inRun("c");
    notes.queue.asyncAhead(notes.note("1"));
    EXPECT_EQ(notes.queue.waitingCount(), 4u);
    notes.queue.asyncAhead([&] {
        notes.text += "2";
        EXPECT_EQ(notes.queue.waitingCount(), 3u) << "what runs waits no more";
        notes.queue.asyncAhead(notes.note("3"));
        notes.queue.suspend();
        suspended.set_value();
    });
    notes.queue.resume();
    suspended.get_future().wait();
    notes.queue.resume();
    notes.drain();
    EXPECT_EQ(notes.text, "123abc=b=c!b!c");
}

TEST(SerialQueue, SyncIsOnItsQueueAndStillOnTheOuterOne) {
    SerialQueue outer("outer"), inner("inner");
    const auto check = [&] {
        inner.sync([&] { EXPECT_TRUE(inner.isCurrent() && outer.isCurrent()); });
        EXPECT_TRUE(outer.isCurrent() && !inner.isCurrent());
    };
    outer.sync(check);
    std::promise<void> release;
    inner.async([&] { release.get_future().wait(); });
    outer.async(check);
    release.set_value();
    outer.sync([] {});
    EXPECT_FALSE(outer.isCurrent());
}

TEST(SerialQueue, SuspensionsNestAndHoldBackOnlyLaterTasks) {
    SerialQueue queue("test");
    std::atomic<int> ran = 0;
    queue.suspend();
    queue.suspend();
    queue.async([&] { ++ran; });
    queue.resume();
    std::promise<void> waiting;
    std::thread waiter([&] {
        waiting.set_value();
        queue.sync([&] { ++ran; });
    });
    waiting.get_future().wait();
    EXPECT_EQ(ran, 0);
    queue.resume();
    waiter.join();
    EXPECT_EQ(ran, 2);

    // A task may suspend its own queue: the next one waits, though it was taken up together with the first.
    std::promise<void> suspended;
    std::atomic<bool> resumed = false;
    queue.suspend();
    queue.async([&] {
        queue.suspend();
        suspended.set_value();
    });
    queue.async([&] { ran = resumed ? 10 : -1; });
    queue.resume();
    suspended.get_future().wait();
    for (int i = 0; i < 10000 && ran == 2; ++i) std::this_thread::yield();  // a chance for one that does not wait
    EXPECT_EQ(ran, 2);
    resumed = true;
    queue.resume();
    queue.sync([] {});
    EXPECT_EQ(ran, 10);
}

TEST(SerialQueue, RunsWhatWaitsWhenTheLastReferenceGoesAlsoInItsOwnTask) {
    auto queue = std::make_shared<SerialQueue>("test");
    std::promise<int> done;
    int ran = 0;
    queue->suspend();
    for (int i = 0; i < 1000; ++i) queue->async([&] { ++ran; });
    queue->async([&, last = queue]() mutable { last.reset(); });
    queue->async([&] { done.set_value(ran); });
    queue->resume();
    queue.reset();
    EXPECT_EQ(done.get_future().get(), 1000);

    auto suspended = std::make_shared<SerialQueue>("test");
    std::promise<void> ranSuspended;
    suspended->suspend();
    suspended->async([&] { ranSuspended.set_value(); });
    suspended.reset();
    ranSuspended.get_future().wait();
}

TEST(SerialQueue, LogsWhatATaskThrowsAndGoesOn) {
    test::CapturedLog log;
    SerialQueue queue("com.example.q");
    queue.async([] { throw std::runtime_error("no luck"); });
    queue.sync([] {});
    EXPECT_TRUE(log.has(LogLevel::error, "Task failed, queue=com.example.q, error=no luck"));
}

// The limit holds for users without privileges, in a process of its own.
TEST(SerialQueueDeathTest, SyncRunsWhatWaitsItselfWhenThereIsNoThreadToBeHad) {
    const auto withoutThreads = [] {
        const rlimit none{1, 1};
        if (geteuid() == 0 && setuid(65534) != 0) std::_Exit(2);
        setrlimit(RLIMIT_NPROC, &none);
        SerialQueue queue("com.example.q");
        std::string order;
        queue.async([&] { order += 'a'; });
        queue.async([&] { order += 'b'; });
        const bool same = queue.sync([&, caller = std::this_thread::get_id()] {
            order += 'c';
            return caller == std::this_thread::get_id();
        });
        queue.sync([&] { order += 'd'; });
        std::_Exit(order == "abcd" && same && queue.waitingCount() == 0 ? 0 : 1);
    };
    EXPECT_EXIT(withoutThreads(), ::testing::ExitedWithCode(0), "Failed to start thread, queue=com.example.q");
}

TEST(SerialQueueDeathTest, StopsWhenItIsResumedTooOften) {
    SerialQueue queue("com.example.q");
    EXPECT_DEATH(queue.resume(), "resume of a queue that is not suspended, queue=com.example.q");
}

}  // namespace
}  // namespace corvane
