// What a host has that uses the library as it comes: events in batches of 50, backed up, delivered to a server.

#include "benchmarks/AgentProcess.h"
#include "benchmarks/BareDocuments.h"
#include "benchmarks/Host.h"
#include "benchmarks/Samples.h"
#include "benchmarks/Suites.h"
#include "benchmarks/Table.h"

#include <corvane/Testing/TemporaryDocuments.h>
#include <corvane/Transfer/InProcessTransferSession.h>

#include <spdlog/async.h>
#include <spdlog/sinks/basic_file_sink.h>

#include <functional>
#include <stdexcept>

namespace corvane::bench {

namespace {

constexpr int together = 20'000, aMillisecond = 2'000;

/// All at once, or one a millisecond.
template <class Call>
Figures calls(int count, Call&& call) {
    return count == together ? burst(count, call) : paced(count, call);
}

/// @param cpu the nanoseconds of CPU time that count
template <class CPU, class Work>
Figures perEvent(int events, CPU&& cpu, Work&& work) {
    const auto before = nanoseconds();
    const double cpuBefore = cpu();
    Figures figures = work();
    figures["CPU us/event"] = (cpu() - cpuBefore) / 1e3 / events;
    if (events == together) figures["events/s"] = events * 1e9 / static_cast<double>(nanoseconds() - before);
    return figures;
}

/// Until the server has answered for the last event.
Figures delivered(const std::string& url, int events, const std::function<double()>& cpu,
                  Durability durability = Durability::processKill) {
    const test::TemporaryDocuments documents;
    const auto processor = std::make_shared<UploadBatchEventProcessor>(
        Client{"com.example.bench", "Bench", "1.0", 1}, Endpoint{url, "end"},
        UploadBatchEventConfig({.durability = durability}));
    Host host(processor);
    const auto deliver = [&](int count) {
        const auto before = processor->waitForDelivery(std::chrono::steady_clock::now()).delivered.events;
        Figures figures = calls(count, [&](int) { host.tracker->submit<ScreenView>(); });
        host.sessions.endSync();
        const auto report = processor->waitForDelivery(std::chrono::steady_clock::now() + std::chrono::seconds(60));
        if (report.delivered.events != before + count) throw std::runtime_error("events were not delivered");
        return figures;
    };
    deliver(50);  // so that everything is there that is made once
    host.sessions.start(Session::Kind::userEvents());
    host.drain();
    return perEvent(events, cpu, [&] { return deliver(events); });
}

/// What hosts use in its place: the finished line goes to a file, and with the process what is not there yet.
Figures logged(int events) {
    const test::TemporaryDocuments documents;
    const std::string text = Host().eventText();
    return perEvent(events, cpuNanoseconds, [&] {
        // Writes the last line before it ends.
        const auto pool = std::make_shared<spdlog::details::thread_pool>(2 * together, 1);
        const auto logger = std::make_shared<spdlog::async_logger>(
            "bench", std::make_shared<spdlog::sinks::basic_file_sink_mt>((documents / "log").string()), pool);
        logger->set_error_handler([](const std::string& message) { throw std::runtime_error(message); });
        return calls(events, [&](int) { logger->info("{}", text); });
    });
}

/// What cannot be done without: the pipeline, and a document for each fifty events.
Figures bareSum(const std::string& url) {
    Host host;
    Figures figures = perEvent(together, cpuNanoseconds, [&] {
        for (int i = 0; i < together; ++i) host.tracker->submit<ScreenView>();
        host.drain();
        return Figures();
    });
    return {{"CPU us/event", figures["CPU us/event"] + bareDocuments(url, true)["CPU us/document"] / 50}};
}

#ifdef CORVANE_AGENT
Figures deliveredByAgent(const std::string& url, int events) {
    const AgentProcess agent;
    TransferSession::setFactory(agent.sessions());
    const auto cpu = [&] { return cpuNanoseconds() + agent.cpuNanoseconds(); };
    const auto figures = delivered(url, events, cpu);
    TransferSession::setFactory(InProcessTransferSession::factory());
    return figures;
}
#endif

}  // namespace

void addEndToEndBenchmarks(const std::string& serverURL) {
    const std::string url = serverURL + "/in";
    for (const int events : {together, aMillisecond}) {
        const std::string how = events == together ? "burst of 20000" : "one a millisecond";
        const std::string name = "end to end/" + how;
        add(
            name, [=] { return delivered(url, events, cpuNanoseconds); }, 3);
        add(
            name + "~do-nothing processor",
            [=] {
                Host host;
                return perEvent(events, cpuNanoseconds, [&] {
                    Figures figures = calls(events, [&](int) { host.tracker->submit<ScreenView>(); });
                    host.drain();
                    return figures;
                });
            },
            3);
        add(
            name + ", power cut", [=] { return delivered(url, events, cpuNanoseconds, Durability::powerCut); }, 3);
        add(
            name + ", power cut~process kill", [=] { return delivered(url, events, cpuNanoseconds); }, 3);
        if (events == together) {
            add(
                name + "~that, and bare documents", [=] { return bareSum(url); }, 3);
            setBar(name + "~that, and bare documents", "CPU us/event", 1.5);
        }
        add(
            name + "~spdlog async, to a file", [=] { return logged(events); }, 3);
#ifdef CORVANE_AGENT
        add(
            name + ", agent", [=] { return deliveredByAgent(url, events); }, 3);
        add(
            name + ", agent~spdlog async, to a file", [=] { return logged(events); }, 3);
#endif
    }
}

}  // namespace corvane::bench
