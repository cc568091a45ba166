// Events made durable: in the database file before their completions run.

#include <corvane/Testing/TemporaryDocuments.h>

#include "benchmarks/Allocations.h"
#include "benchmarks/BackupOnly.h"
#include "benchmarks/BareSQLite.h"
#include "benchmarks/Host.h"
#include "benchmarks/Samples.h"
#include "benchmarks/Suites.h"
#include "benchmarks/Table.h"

#include <fstream>

namespace corvane::bench {

namespace {

std::string hex(const std::string& bytes) {
    static constexpr char digits[] = "0123456789ABCDEF";
    std::string out;
    for (const unsigned char c : bytes) {
        out += digits[c >> 4];
        out += digits[c & 15];
    }
    return out;
}

/// Bytes that this process has given to the kernel to write.
double writtenBytes() {
    std::ifstream file("/proc/self/io");
    for (std::string name; file >> name;) {
        double value = 0;
        file >> value;
        if (name == "wchar:") return value;
    }
    return 0;
}

template <class Work>
Figures perEvent(int events, Work&& work) {
    const auto before = nanoseconds();
    const double cpu = cpuNanoseconds(), written = writtenBytes();
    const auto allocations = Allocations::now();
    work();
    const double elapsed = static_cast<double>(nanoseconds() - before);
    return {{"us/event", elapsed / 1e3 / events},
            {"events/s", events * 1e9 / elapsed},
            {"CPU us/event", (cpuNanoseconds() - cpu) / 1e3 / events},
            {"bytes written/event", (writtenBytes() - written) / events},
            {"allocations/event", static_cast<double>(Allocations::now().count - allocations.count) / events}};
}

/// Rewrites the same row with one event more each time, and deletes it when the batch is full: what the table's form
/// cannot do without. The texts are ready before.
Figures bareRewrites(int events, int batchSize, int alreadyThere) {
    const test::TemporaryDocuments documents;
    BareSQLite database(documents / "bare.db");
    Host host;
    const std::string event =
        hex(R"({"data":)" + host.eventText() + R"(,"metadata":{"name":"ScreenView","version":"0.1.0"}})");
    std::string start = hex(R"({"events":[)"), row = start;
    for (int i = 0; i < alreadyThere; ++i) row += event + "2C";
    return perEvent(events, [&] {
        for (int i = 0; i < events; ++i) {
            if (row.size() > start.size()) row += "2C";
            row += event;
            database.run(BareSQLite::rowOf(row + "5D7D"));
            if ((i + 1) % batchSize) continue;
            database.run(BareSQLite::deletionOfRow());
            row = start;
        }
    });
}

void addBatches() {
    constexpr int events = 5'000, batchSize = 50;
    const std::string name = "durable/batch of 50";
    add(name, [] {
        const test::TemporaryDocuments documents;
        Host host(backupOnly("batch", batchSize));
        return perEvent(events, [&] {
            for (int i = 0; i < events; ++i) host.tracker->submit<ScreenView>();
            host.drain();
        });
    });
    add(name + "~bare SQLite, same row", [] { return bareRewrites(events, batchSize, 0); });
    add(name + "~bare insert of 400 bytes", [] {
        const test::TemporaryDocuments documents;
        BareSQLite database(documents / "bare.db");
        const std::string text = std::string(400, 'x');
        return perEvent(events, [&] {
            for (int i = 0; i < events; ++i) {
                database.run("INSERT INTO batches VALUES ('" + std::to_string(i) + "', '" + text + "', '');");
            }
        });
    });
    setBar(name + "~bare SQLite, same row", "us/event", 1.25);
}

void addGroup() {
    constexpr int events = 100, there = 5'000;
    const std::string name = "durable/event in a group of 5000";
    add(
        name,
        [] {
            const test::TemporaryDocuments documents;
            Host host(backupOnly("group", 50));
            host.tracker->enterGroup("checkout");
            for (int i = 0; i < there; ++i) host.tracker->submit<ScreenView>();
            host.drain();
            return perEvent(events, [&] {
                for (int i = 0; i < events; ++i) host.tracker->submit<ScreenView>();
                host.drain();
            });
        },
        1);
    add(
        name + "~bare SQLite, same row", [] { return bareRewrites(events, there * 2, there); }, 3);
    setBar(name + "~bare SQLite, same row", "us/event", 1.25);
}

}  // namespace

void addDurableBenchmarks() {
    addBatches();
    addGroup();
}

}  // namespace corvane::bench
