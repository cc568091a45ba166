// What the library does under loads that no host should have, each in a process of its own:
//
//     measure_load [SCENARIO]
//
// Transfers run inside the process. Prints for each how long a caller's submissions took, the growth of the process's
// memory at its highest, and how long it was until the first delivery and until the last.

#include "benchmarks/Host.h"
#include "benchmarks/Samples.h"
#include "benchmarks/Server.h"

#include <corvane/Testing/TemporaryDocuments.h>

#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <random>
#include <string>
#include <string_view>

using namespace corvane;
using namespace corvane::bench;
using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

namespace {

struct Page {
    std::string text;
};
struct PageView {
    EventProperty<EventData> event = required;
    EventProperty<Page> page = required;
};

double seconds(Clock::duration time) {
    return std::chrono::duration<double>(time).count();
}

/// In KiB.
long peakMemory() {
    std::ifstream status("/proc/self/status");
    for (std::string word; status >> word;) {
        long value = 0;
        if (word == "VmHWM:" && status >> value) return value;
    }
    return 0;
}

/// How long calls took, in a memory that does not grow with their number.
class Calls {
  public:
    template <class Call>
    void measure(Call&& call) {
        const auto before = nanoseconds();
        call();
        const auto bucket = static_cast<std::size_t>(nanoseconds() - before) / 10;
        ++counts_[std::min(bucket, counts_.size() - 1)];
        ++count_;
    }
    void print() const {
        std::printf("  calls: %ld, median %ld ns, 99.9th percentile %ld ns, slowest %ld us\n", count_, at(0.5),
                    at(0.999), at(1) / 1000);
    }

  private:
    [[nodiscard]] long at(double quantile) const {
        long below = 0;
        for (std::size_t i = 0; i < counts_.size(); ++i) {
            below += counts_[i];
            if (static_cast<double>(below) >= quantile * static_cast<double>(count_)) return static_cast<long>(i) * 10;
        }
        return 0;
    }

    std::array<long, 1'000'000> counts_{};  // of 10 ns each
    long count_ = 0;
};

class Load {
  public:
    Load(const std::string& url, const UploadBatchEventOptions& options)
        : uploads_(std::make_shared<UploadBatchEventProcessor>(Client{"com.example.player", "Player", "2.3", 117},
                                                               Endpoint{url, "main"}, UploadBatchEventConfig(options))),
          memory_(peakMemory()),
          host_(std::make_unique<Host>(uploads_)) {
        watch_ = std::thread([this] {
            while (!isOver_ && uploads_->ledger().delivered.documents == 0) std::this_thread::sleep_for(1ms);
            if (!isOver_) first_ = seconds(Clock::now() - began_);
        });
    }

    Tracker& tracker() { return *host_->tracker; }
    SessionManager& sessions() { return host_->sessions; }
    Calls& calls() { return *calls_; }

    /// Submits for some time, so many in each millisecond.
    void submit(std::chrono::milliseconds time, int each) {
        auto next = Clock::now();
        for (auto i = 0ms; i < time; ++i) {
            std::this_thread::sleep_until(next += 1ms);
            for (int j = 0; j < each; ++j) {
                calls_->measure([&] { host_->tracker->submit<ScreenView>(); });
            }
            waiting_ = std::max(waiting_, host_->sessions.waitingCount());
        }
        std::printf("  submitted in %.1f s, at most %lu calls waited\n", seconds(Clock::now() - began_), waiting_);
    }

    /// Ends the session, waits, and says what has become of all.
    void finish(std::chrono::seconds patience) {
        host_->sessions.endSync();
        std::printf("  session ended after %.1f s\n", seconds(Clock::now() - began_));
        uploads_->waitForDelivery(Clock::now() + patience);
        const double last = seconds(Clock::now() - began_);
        isOver_ = true;
        watch_.join();
        const auto ledger = uploads_->ledger();
        calls_->print();
        std::printf(
            "  first delivery %.3f s, waited until %.1f s; delivered %ld events in %ld documents, waiting %ld in %ld,"
            " attempts in vain %ld, unaccounted %ld\n",
            first_.load(), last, ledger.delivered.events, ledger.delivered.documents, ledger.waiting.events,
            ledger.waiting.documents, ledger.sentAgain.documents, ledger.unaccounted);
        std::printf("  memory: %.1f MiB more at its highest\n", static_cast<double>(peakMemory() - memory_) / 1024);
    }

  private:
    const std::shared_ptr<UploadBatchEventProcessor> uploads_;
    const std::unique_ptr<Calls> calls_ = std::make_unique<Calls>();
    const Clock::time_point began_ = Clock::now();
    const long memory_;
    std::unique_ptr<Host> host_;
    std::uint64_t waiting_ = 0;
    std::atomic<bool> isOver_ = false;
    std::atomic<double> first_ = -1;
    std::thread watch_;
};

/// Runs in a child, whose memory is its own. Its files stay for the next.
template <class Work>
void inChild(const Work& work) {
    std::fflush(stdout);
    const pid_t child = fork();
    if (child == 0) {
        work();
        std::fflush(stdout);
        _exit(0);
    }
    int status = 0;
    waitpid(child, &status, 0);
    if (status != 0) std::printf("  FAILED: the process ended with %d\n", status);
}

/// 100 KB that do not compress, of 64 characters, in each of 10,000 documents.
void leaveBacklog() {
    Log::shared().setSink([](LogLevel, std::string_view) {});  // of 10,000 uploads without a server
    UploadBatchEventOptions options{.batchSize = 1};
    options.maximumBytesOnDisk = std::int64_t{8} << 30;
    const auto uploads = std::make_shared<UploadBatchEventProcessor>(Client{"com.example.player", "Player", "2.3", 117},
                                                                     Endpoint{"http://127.0.0.1:9", "main"},
                                                                     UploadBatchEventConfig(options));
    Host host(uploads);
    std::mt19937 random(1);
    for (int i = 0; i < 10'000; ++i) {
        std::string text(133'000, ' ');
        for (auto& character : text) character = static_cast<char>('0' + random() % 64);
        host.tracker->push(Page{std::move(text)});
        host.tracker->submit<PageView>();
        host.tracker->pop<Page>();
        if (i % 16 == 15) host.drain();
    }
    host.drain();
    const auto waiting = uploads->ledger().waiting;
    std::printf("  left by an earlier run: %ld documents\n", waiting.documents);
    std::fflush(stdout);
    _exit(0);  // as a process that is killed
}

void backlog() {
    const Server server;
    inChild(leaveBacklog);
    inChild([&] {
        UploadBatchEventOptions options;
        options.maximumBytesOnDisk = std::int64_t{8} << 30;
        Load load(server.url(), options);
        load.submit(10s, 1);
        load.finish(600s);
    });
}

void flood() {
    const Server server;
    inChild([&] {
        Load load(server.url(), {});
        load.submit(60s, 100);
        load.finish(600s);
    });
}

void sessions() {
    const Server server;
    inChild([&] {
        Load load(server.url(), {});
        for (int i = 0; i < 1000; ++i) {
            for (int j = 0; j < 10; ++j) load.calls().measure([&] { load.tracker().submit<ScreenView>(); });
            load.sessions().end();
            load.sessions().start(Session::Kind::userEvents());
        }
        load.finish(120s);
    });
}

void trickle() {
    const Server server(Server::Manner::trickles);
    inChild([&] {
        Load load(server.url(), {});
        load.submit(10s, 1);
        load.finish(10s);
    });
}

void refusal() {
    const Server server(Server::Manner::refusesOne);
    inChild([&] {
        Load load(server.url(), {.batchSize = 10, .retryDelay = 100ms});
        load.submit(10s, 1);
        load.finish(20s);
    });
}

constexpr struct {
    std::string_view name;
    const char* title;
    void (*run)();
} scenarios[] = {
    {"backlog", "10,000 documents of 100 KB wait at a start, and 1,000 events a second come", backlog},
    {"flood", "100,000 events a second for a minute", flood},
    {"sessions", "1,000 sessions of 10 events, one behind the other", sessions},
    {"trickle", "a server that takes one byte a second, and 1,000 events a second", trickle},
    {"refusal", "a server that always refuses the first document, retried every 100 ms, and 1,000 events a second",
     refusal},
};

}  // namespace

int main(int argc, char** argv) {
    TransferSession::setFactory(InProcessTransferSession::factory());
    for (const auto& scenario : scenarios) {
        if (argc > 1 && scenario.name != argv[1]) continue;
        const test::TemporaryDocuments documents;
        std::printf("%s\n", scenario.title);
        scenario.run();
    }
}
