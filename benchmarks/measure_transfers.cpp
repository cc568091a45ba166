// What the transfer agent costs, beside the session inside the process, in one run:
//
//     measure_transfers [TASKS]
//
// Prints the time from opening the first session to the agent's first answer, the time that `resume` takes the caller
// and the time from there to the completion callback, one task at a time and all at once, for both kinds of session,
// and the agent's memory with 1,000 tasks that wait.

#include "tests/support/Files.h"

#include <corvane/Agent/Host/BackgroundTransferSession.h>
#include <corvane/Testing/ScriptedServer.h>
#include <corvane/Testing/TemporaryDocuments.h>
#include <corvane/Transfer/InProcessTransferSession.h>

#include <signal.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <future>
#include <semaphore>
#include <sstream>
#include <string>
#include <vector>

using namespace corvane;
using namespace corvane::test;
using Clock = std::chrono::steady_clock;

namespace {

class Counter final : public TransferSessionDelegate {
  public:
    void taskDidSendBodyData(const TransferTask&, std::int64_t, std::int64_t, std::int64_t) override {}
    void taskDidComplete(const TransferTask&, const std::optional<AnyError>& error,
                         const std::optional<TransferResponse>&) override {
        failed += error.has_value();
        completed.release();
    }
    void allEventsDelivered() override {}

    std::counting_semaphore<1'000'000> completed{0};
    std::atomic<int> failed = 0;
};

double microseconds(Clock::duration time) {
    return std::chrono::duration<double, std::micro>(time).count();
}

double median(std::vector<double> values) {
    std::nth_element(values.begin(), values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2), values.end());
    return values[values.size() / 2];
}

void measure(const char* name, TransferSession& session, Counter& counter, const std::string& url,
             const std::filesystem::path& body, int tasks) {
    std::vector<double> calls, latencies;
    const auto resume = [&] {
        const auto task = session.uploadTask({.url = url, .headers = {}}, body);
        const auto start = Clock::now();
        task->resume();
        calls.push_back(microseconds(Clock::now() - start));
        return start;
    };
    for (int i = 0; i < tasks; ++i) {
        const auto start = resume();
        counter.completed.acquire();
        latencies.push_back(microseconds(Clock::now() - start));
    }
    const auto start = Clock::now();
    for (int i = 0; i < tasks; ++i) resume();
    for (int i = 0; i < tasks; ++i) counter.completed.acquire();
    std::printf("%-10s resume %6.1f us, one at a time %7.1f us, %d at once %7.1f us each (medians; failed: %d)\n", name,
                median(calls), median(latencies), tasks, microseconds(Clock::now() - start) / tasks,
                counter.failed.load());
}

void listed(TransferSession& session) {
    std::promise<void> answer;
    session.tasks([&](const auto&) { answer.set_value(); });
    answer.get_future().wait();
}

void printMemory(long agent) {
    std::istringstream rollup(readFile("/proc/" + std::to_string(agent) + "/smaps_rollup"));
    long privately = 0, resident = 0;
    for (std::string name; rollup >> name;) {
        long value = 0;
        if (name == "Rss:" && rollup >> value) resident = value;
        if (name.starts_with("Private_") && rollup >> value) privately += value;
    }
    std::printf("agent with 1000 waiting tasks: %ld KiB private, %ld KiB resident\n", privately, resident);
}

}  // namespace

int main(int argc, char** argv) {
    const int tasks = argc > 1 ? std::atoi(argv[1]) : 300;
    const TemporaryDocuments documents;
    ScriptedServer server;
    const auto body = documents / "body";
    writeFile(body, std::string(2000, 'x'));
    TransferAgentOptions options;
    options.program = CORVANE_AGENT;
    options.directory = documents / "agent";
    const TransferSessionConfiguration configuration{.identifier = "measure"};

    const auto counter = std::make_shared<Counter>();
    const auto opened = Clock::now();
    auto background = std::make_shared<BackgroundTransferSession>(configuration, counter, nullptr, options);
    std::printf("agent start: the call %.1f ms, ", microseconds(Clock::now() - opened) / 1000);
    listed(*background);
    std::printf("its first answer %.1f ms\n", microseconds(Clock::now() - opened) / 1000);

    InProcessTransferSession inside(configuration, counter);
    for (int round = 0; round < 2; ++round) {
        measure("agent", *background, *counter, server.url(), body, tasks);
        measure("in process", inside, *counter, server.url(), body, tasks);
    }
    server.script(ScriptedServer::Reply::never(), 4);
    for (int i = 0; i < 1000; ++i) background->uploadTask({.url = server.url(), .headers = {}}, body)->resume();
    listed(*background);
    const long agent = std::atol(readFile(options.directory / "agent.lock").c_str());
    printMemory(agent);
    background.reset();
    kill(static_cast<pid_t>(agent), SIGKILL);
    return 0;
}
