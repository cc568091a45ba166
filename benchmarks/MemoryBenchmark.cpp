// What waiting submissions and kept events take.

#include "benchmarks/Allocations.h"
#include "benchmarks/BackupOnly.h"
#include "benchmarks/Host.h"
#include "benchmarks/Suites.h"
#include "benchmarks/Table.h"

#include <corvane/Testing/TemporaryDocuments.h>

#include <atomic>

namespace corvane::bench {

namespace {

constexpr int submissions = 1'000'000;

Figures burstOfAMillion() {
    Host host;
    std::atomic<int> completed = 0;
    const auto before = Allocations::now();
    host.tracker->suspend();
    for (int i = 0; i < submissions; ++i) {
        host.tracker->submit<ScreenView>(
            [&completed](const EventSubmitResult& result) { completed += result.succeeded(); });
    }
    const double waiting = static_cast<double>(Allocations::now().inUse - before.inUse);
    host.tracker->resume();
    host.drain();
    return {{"bytes/waiting", waiting / submissions}, {"dropped", submissions - completed.load()}};
}

/// The same with events that are backed up, delivered nowhere, and with nobody who holds the queue.
Figures durableBurstOfAMillion() {
    const test::TemporaryDocuments documents;
    Host host(backupOnly("burst", 50));
    Allocations::restartPeak();
    const auto before = Allocations::now();
    for (int i = 0; i < submissions; ++i) host.tracker->submit<ScreenView>();
    host.drain();
    return {{"MB at most", static_cast<double>(Allocations::now().peak - before.inUse) / 1e6}};
}

Figures keptEvents() {
    constexpr int events = 10'000;  // as many as are kept
    Host host;
    const double text = static_cast<double>(host.eventText().size());
    const auto before = Allocations::now();
    for (int i = 0; i < events; ++i) host.tracker->submit<ScreenView>();
    host.drain();
    const double kept = static_cast<double>(Allocations::now().inUse - before.inUse) / events;
    return {{"bytes/event", kept}, {"times its JSON text", kept / text}};
}

}  // namespace

void addMemoryBenchmarks() {
    add("memory/burst of a million submissions", burstOfAMillion, 1);
    setLimit("memory/burst of a million submissions", "bytes/waiting", 256);
    setLimit("memory/burst of a million submissions", "dropped", 0);
    add("memory/burst of a million durable events", durableBurstOfAMillion, 1);
    setLimit("memory/burst of a million durable events", "MB at most", 250);
    add("memory/event kept by a running session", keptEvents, 1);
    setLimit("memory/event kept by a running session", "times its JSON text", 2);
}

}  // namespace corvane::bench
