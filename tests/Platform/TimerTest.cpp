#include <corvane/Platform/Timer.h>

#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tests/support/PassTime.h"
#include "tests/support/Testing.h"

namespace corvane {
namespace {

using namespace std::chrono_literals;

using test::passTime;

TEST(Timer, FiresOnceAtItsTimeOnItsQueueUnlessItIsCancelled) {
    std::string fired;
    SerialQueue queue("test");
    const auto set = [&](char name, std::chrono::nanoseconds delay) {
        return Timer::after(queue, delay, [&, name] {
            EXPECT_TRUE(queue.isCurrent());
            fired += name;
        });
    };
    auto late = set('l', 2h), early = set('e', 1h), cancelled = set('c', 1h), replaced = set('r', 1h);
    const Timer forEver = set('f', std::chrono::nanoseconds::max());
    { const Timer dropped = set('d', 1h); }
    replaced = set('R', 3h);
    passTime(queue, 59min);
    EXPECT_EQ(fired, "");
    cancelled.cancel();
    EXPECT_FALSE(cancelled.isSet());
    EXPECT_TRUE(early.isSet());
    queue.suspend();
    BootClock::advance(2h);
    queue.async([&] { late.cancel(); });
    EXPECT_EQ(queue.waitingCount(), 1u) << "nothing fires in a suspended queue";
    queue.resume();
    passTime(queue);
    EXPECT_EQ(fired, "e") << "one that is cancelled on the queue does not begin";
    passTime(queue, 2h);
    EXPECT_EQ(fired, "eR");
    EXPECT_FALSE(replaced.isSet());
}

TEST(Timer, WakesASleepingWorkerAndIsWokenForOtherWork) {
    std::promise<void> first, second;
    Timer inner;
    SerialQueue queue("test");
    const Timer far = Timer::after(queue, 1h, [] { FAIL(); });
    passTime(queue);
    const Timer near = Timer::after(queue, -1ms, [&] {
        inner = Timer::after(queue, 1ms, [&] { second.set_value(); });
        first.set_value();
    });
    EXPECT_EQ(first.get_future().wait_for(10s), std::future_status::ready);
    EXPECT_EQ(second.get_future().wait_for(10s), std::future_status::ready);
    EXPECT_EQ(queue.sync([] { return 7; }), 7);
    passTime(queue);
}

TEST(Timer, GoesWithItsQueue) {
    Timer timer;
    const auto held = std::make_shared<int>();
    {
        SerialQueue queue("test");
        timer = Timer::after(queue, 1h, [held] { FAIL(); });
        passTime(queue);
    }
    while (held.use_count() > 1) std::this_thread::yield();  // its worker has ended
    EXPECT_FALSE(timer.isSet());
    timer.cancel();
}

TEST(TimerDeathTest, WorksWithoutDescriptorsAndDoesNothingInAChildOrAfterMain) {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    const auto endsWell = [] {
        test::CapturedLog log;
        static bool hasFired = false;
        static SerialQueue& queue = *new SerialQueue("test");
        std::atexit([] {  // behind the one that the first timer registers
            passTime(queue, 2h);
            _exit(hasFired ? 1 : 0);
        });
        rlimit none{};
        getrlimit(RLIMIT_NOFILE, &none);
        none.rlim_cur = 0;
        setrlimit(RLIMIT_NOFILE, &none);
        std::promise<void> fired;
        Timer timer = Timer::after(queue, 1h, [&] { fired.set_value(); });
        while (log.count("Timers may be late, queue=test, error=") != 1) std::this_thread::yield();
        passTime(queue, 1h);
        fired.get_future().wait();
        none.rlim_cur = none.rlim_max;
        setrlimit(RLIMIT_NOFILE, &none);
        timer = Timer::after(queue, 1h, [] { hasFired = true; });
        passTime(queue);
        if (const pid_t child = fork(); child != 0) {
            int status = 0;
            waitpid(child, &status, 0);
            if (status != 0) _exit(2);
        } else {
            alarm(20);
            timer = Timer::after(queue, 0ms, [] { _exit(3); });
            timer.cancel();
            _exit(0);
        }
        std::exit(9);
    };
    EXPECT_EXIT(endsWell(), ::testing::ExitedWithCode(0), "");
}

}  // namespace
}  // namespace corvane
