// What a call costs the host's thread.

#include "benchmarks/Host.h"
#include "benchmarks/Samples.h"
#include "benchmarks/Suites.h"
#include "benchmarks/Table.h"

#include <corvane/Store/DeferredStoreCore.h>

#include <spdlog/async.h>
#include <spdlog/sinks/base_sink.h>
#include <spdlog/sinks/basic_file_sink.h>

#include <array>
#include <condition_variable>
#include <future>
#include <mutex>
#include <stdexcept>
#include <thread>

namespace corvane::bench {

namespace {

constexpr int burstCalls = 100'000, pacedCalls = 1'000;

/// The least that a hand-over to another thread can be: a mutex, a condition variable, and items of a task's size.
class BareQueue {
  public:
    BareQueue() : thread_([this] { run(); }) {}
    ~BareQueue() {
        post(true);
        thread_.join();
    }
    void post(bool last = false) {
        bool wake = false;
        {
            const std::lock_guard lock(mutex_);
            waiting_.push_back({{}, last});
            wake = std::exchange(asleep_, false);
        }
        if (wake) arrived_.notify_one();
    }

  private:
    struct Item {
        std::array<char, 112> storage;
        bool isLast;
    };

    void run() {
        std::vector<Item> taken;
        while (taken.empty() || !taken.back().isLast) {
            taken.clear();
            std::unique_lock lock(mutex_);
            while (waiting_.empty()) {
                asleep_ = true;
                arrived_.wait(lock);
            }
            taken.swap(waiting_);
        }
    }

    std::mutex mutex_;
    std::condition_variable arrived_;
    std::vector<Item> waiting_;
    bool asleep_ = false;
    std::thread thread_;
};

/// spdlog's asynchronous logger with room for a whole burst. Its lines are formatted and dropped by the system.
class AsyncLogger {
  public:
    explicit AsyncLogger(spdlog::sink_ptr sink = std::make_shared<spdlog::sinks::basic_file_sink_mt>("/dev/null"))
        : logger_(std::make_shared<spdlog::async_logger>("bench", std::move(sink), pool_,
                                                         spdlog::async_overflow_policy::block)) {
        // An error is no line: the figure would be that of the error.
        logger_->set_error_handler([](const std::string& message) { throw std::runtime_error(message); });
    }

    void log(int i) { logger_->info("screen={} depth={} viewer={} plan={}", home.name, i, viewer.id, *viewer.plan); }

  private:
    std::shared_ptr<spdlog::details::thread_pool> pool_ =
        std::make_shared<spdlog::details::thread_pool>(4 * burstCalls, 1);
    std::shared_ptr<spdlog::async_logger> logger_;
};

/// Holds up the logger's thread with the first line, until it is released.
class HeldSink final : public spdlog::sinks::base_sink<std::mutex> {
  public:
    void release() { released_.set_value(); }

  protected:
    void sink_it_(const spdlog::details::log_msg&) override { isReleased_.wait(); }
    void flush_() override {}

  private:
    std::promise<void> released_;
    std::shared_future<void> isReleased_ = released_.get_future().share();
};

/// The enqueueing alone, without another thread that takes the same lock.
void addUncontended() {
    const std::string name = "caller/submit, burst, worker held";
    add(name, [] {
        Host host;
        host.tracker->suspend();
        auto figures = burst(burstCalls, [&](int) { host.tracker->submit<ScreenView>(); });
        host.tracker->resume();
        host.drain();
        return figures;
    });
    add(name + "~spdlog async", [] {
        const auto sink = std::make_shared<HeldSink>();
        AsyncLogger logger(sink);
        auto figures = burst(burstCalls, [&](int i) { logger.log(i); });
        sink->release();
        return figures;
    });
    setBar(name + "~spdlog async", "mean ns", 0.5);
    setBar(name + "~spdlog async", "p99.9 ns", 1);
}

void addSubmit() {
    add("caller/submit, burst", [] {
        Host host;
        const auto figures = burst(burstCalls, [&](int) { host.tracker->submit<ScreenView>(); });
        host.drain();
        return figures;
    });
    add("caller/submit, burst~spdlog async", [] {
        AsyncLogger logger;
        return burst(burstCalls, [&](int i) { logger.log(i); });
    });
    add("caller/submit, burst~bare queue", [] {
        BareQueue queue;
        return burst(burstCalls, [&](int) { queue.post(); });
    });
    setBar("caller/submit, burst~spdlog async", "mean ns", 0.5);
    setBar("caller/submit, burst~spdlog async", "p99.9 ns", 1);

    add("caller/submit, one a millisecond", [] {
        Host host;
        return paced(pacedCalls, [&](int) { host.tracker->submit<ScreenView>(); });
    });
    add("caller/submit, one a millisecond~spdlog async", [] {
        AsyncLogger logger;
        return paced(pacedCalls, [&](int i) { logger.log(i); });
    });
    add("caller/submit, one a millisecond~bare queue", [] {
        BareQueue queue;
        return paced(pacedCalls, [&](int) { queue.post(); });
    });
    setBar("caller/submit, one a millisecond~spdlog async", "median ns", 0.5);
    setBar("caller/submit, one a millisecond~spdlog async", "p99.9 ns", 1);
}

/// The mean over all threads, which submit at the same time.
template <class Call>
Figures fromThreads(int threads, Call call) {
    std::vector<std::thread> running;
    std::vector<double> means(static_cast<std::size_t>(threads));
    for (int t = 0; t < threads; ++t) {
        running.emplace_back([&, t] {
            const auto before = nanoseconds();
            for (int i = 0; i < burstCalls / threads; ++i) call(i);
            means[static_cast<std::size_t>(t)] = static_cast<double>(nanoseconds() - before) / (burstCalls / threads);
        });
    }
    double sum = 0;
    for (int t = 0; t < threads; ++t) {
        running[static_cast<std::size_t>(t)].join();
        sum += means[static_cast<std::size_t>(t)];
    }
    return {{"mean ns", sum / threads}};
}

void addThreads() {
    for (const int threads : {1, 2, 4}) {
        const std::string name = "caller/submit from " + std::to_string(threads) + " threads";
        add(name, [threads] {
            Host host;
            const auto figures = fromThreads(threads, [&](int) { host.tracker->submit<ScreenView>(); });
            host.drain();
            return figures;
        });
        add(name + "~spdlog async", [threads] {
            AsyncLogger logger;
            return fromThreads(threads, [&](int i) { logger.log(i); });
        });
        add(name + "~bare queue", [threads] {
            BareQueue queue;
            return fromThreads(threads, [&](int) { queue.post(); });
        });
    }
}

/// A burst while the store, or the network, does not answer, beside the same burst when all is well.
void addStalls(const std::string& serverURL) {
    const auto submitTo = [](const std::string& url, bool stall) {
        const auto processor = std::make_shared<UploadBatchEventProcessor>(
            Client{"com.example.bench", "Bench", "1.0", 1}, Endpoint{url, "stalled"});
        Host host(processor);
        std::promise<void> stalled;
        std::thread holder;
        if (stall) {
            holder = std::thread([&] {
                DeferredStoreCore::queue().sync([&] {
                    stalled.set_value();
                    std::this_thread::sleep_for(std::chrono::seconds(1));
                });
            });
            stalled.get_future().wait();
        }
        const auto figures = burst(2'000, [&](int) { host.tracker->submit<ScreenView>(); });
        if (holder.joinable()) holder.join();
        host.drain();
        return figures;
    };
    add(
        "caller/submit, store stalled for a second", [=] { return submitTo(serverURL + "/in", true); }, 3);
    add(
        "caller/submit, store stalled for a second~all is well", [=] { return submitTo(serverURL + "/in", false); }, 3);
    add(
        "caller/submit, network hangs", [=] { return submitTo(serverURL + "/never", false); }, 3);
    add(
        "caller/submit, network hangs~all is well", [=] { return submitTo(serverURL + "/in", false); }, 3);
}

template <class Call>
void addOperation(const std::string& name, Call call) {
    add(name, [call] {
        Host host;
        const auto figures = burst(burstCalls / 10, [&](int i) { call(host, i); });
        host.drain();
        return figures;
    });
    add(name + "~bare queue", [] {
        BareQueue queue;
        return burst(burstCalls / 10, [&](int) { queue.post(); });
    });
}

}  // namespace

void addCallerBenchmarks(const std::string& serverURL) {
    addSubmit();
    addUncontended();
    addThreads();
    addStalls(serverURL);
    addOperation("caller/push", [](Host& host, int) { host.tracker->push(home); });
    addOperation("caller/time", [](Host& host, int) { host.tracker->time<ScreenView>(); });
    addOperation("caller/enterGroup", [](Host& host, int) { host.tracker->enterGroup("checkout"); });
    addOperation("caller/chain", [](Host& host, int) { static_cast<void>(host.tracker->chain("row")); });
}

}  // namespace corvane::bench
