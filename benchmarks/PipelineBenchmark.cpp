// From a submission to its finished JSON text, on the library's own thread.

#include "benchmarks/Allocations.h"
#include "benchmarks/Host.h"
#include "benchmarks/Samples.h"
#include "benchmarks/Suites.h"
#include "benchmarks/Table.h"

#include <corvane/Platform/UUID.h>

#include <spdlog/sinks/null_sink.h>
#include <spdlog/spdlog.h>
#include <boost/json.hpp>

namespace corvane::bench {

namespace {

constexpr int events = 50'000;

/// What one of `events` repetitions costs.
template <class Work>
Figures perEvent(Work&& work) {
    const auto allocations = Allocations::now();
    const auto before = nanoseconds();
    const double cpu = cpuNanoseconds();
    work();
    Figures figures;
    figures["ns/event"] = static_cast<double>(nanoseconds() - before) / events;
    figures["CPU ns/event"] = (cpuNanoseconds() - cpu) / events;
    figures["allocations/event"] = static_cast<double>(Allocations::now().count - allocations.count) / events;
    return figures;
}

/// Keeps what nobody reads from being left out.
std::size_t kept = 0;

/// The same document, built and serialised as a host without the library would.
std::string byHand(const std::string& sessionID) {
    const boost::json::object document{{"event", boost::json::object{{"eventID", newUUID()},
                                                                     {"eventTime", millisecondsSince1970(now())},
                                                                     {"eventPath", "/root/player"},
                                                                     {"sessionID", sessionID}}},
                                       {"screen", boost::json::object{{"name", home.name}, {"depth", home.depth}}},
                                       {"viewer", boost::json::object{{"id", viewer.id}, {"plan", *viewer.plan}}}};
    return boost::json::serialize(document);
}

Figures throughQueue(const std::shared_ptr<EventProcessorType>& processor) {
    Host host(processor);
    return perEvent([&] {
        for (int i = 0; i < events; ++i) host.tracker->submit<ScreenView>();
        host.drain();
    });
}

/// The library's own log lines go to a sink that does nothing.
class SilentLog {
  public:
    SilentLog() {
        Log::shared().setSink([](LogLevel, std::string_view text) { kept += text.size(); });
        Log::shared().setLevel(LogLevel::debug);
    }
    SilentLog(const SilentLog&) = delete;
    SilentLog& operator=(const SilentLog&) = delete;
    ~SilentLog() {
        Log::shared().setLevel(LogLevel::error);
        Log::shared().setSink({});
    }
};

}  // namespace

void addPipelineBenchmarks() {
    const std::string text = "pipeline/resolve, validate, encode";
    add(text, [] {
        Host host;
        Figures figures;
        host.onQueue([&](AccessTracker& access) {
            figures = perEvent([&] {
                for (int i = 0; i < events; ++i) access.submit<ScreenView>();
            });
        });
        return figures;
    });
    add(text + "~Boost.JSON by hand", [] {
        const std::string sessionID = newUUID();
        return perEvent([&] {
            for (int i = 0; i < events; ++i) kept += byHand(sessionID).size();
        });
    });
    setBar(text + "~Boost.JSON by hand", "ns/event", 0.6);

    add("pipeline/to a processor that does nothing", [] { return throughQueue(std::make_shared<NullProcessor>()); });
    add("pipeline/to the logging processor", [] {
        const SilentLog log;
        return throughQueue(std::make_shared<LoggingEventProcessor>());
    });
    add("pipeline/to the logging processor~spdlog, finished text", [] {
        Host host;
        const std::string finished = host.eventText();
        spdlog::logger logger("bench", std::make_shared<spdlog::sinks::null_sink_mt>());
        return perEvent([&] {
            for (int i = 0; i < events; ++i) logger.info("{}", finished);
        });
    });
}

}  // namespace corvane::bench
