// Events made durable one at a time: in the database file before the completion runs. Bursts are measured from end to
// end, since a batch that fills up in one is not written before it is handed over.

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

constexpr int events = 5'000, batchSize = 50;

/// Each event durable before the next one is submitted, without a change of threads.
/// @param inGroup that many are in the tracker's group before; otherwise batches are handed over when they are full
Figures oneAtATime(int inGroup, Durability durability = Durability::processKill) {
    const test::TemporaryDocuments documents;
    Host host(backupOnly("paced", batchSize, durability));
    if (inGroup > 0) host.tracker->enterGroup("checkout");
    for (int i = 0; i < inGroup; ++i) host.tracker->submit<ScreenView>();
    host.drain();
    Figures figures;
    host.onQueue([&](AccessTracker& access) {
        figures = perEvent(events, [&] {
            for (int i = 0; i < events; ++i) access.submit<ScreenView>();
        });
    });
    return figures;
}

/// Rewrites the same row with one event more each time, and deletes it when the batch is full: what the table's form
/// cannot do without when events come one at a time. The texts are ready before.
Figures bareRewrites() {
    const test::TemporaryDocuments documents;
    BareSQLite database(documents / "bare.db");
    Host host;
    const std::string event =
        hex(R"({"data":)" + host.eventText() + R"(,"metadata":{"name":"ScreenView","version":"0.1.0"}})");
    const std::string start = hex(R"({"events":[)");
    std::string row = start;
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

/// A row of its own for each event, in a transaction of its own: what a host would write by hand.
Figures bareInserts() {
    const test::TemporaryDocuments documents;
    BareSQLite database(documents / "bare.db");
    const std::string text = std::string(400, 'x');
    return perEvent(events, [&] {
        for (int i = 0; i < events; ++i) {
            database.run("INSERT INTO batches VALUES ('" + std::to_string(i) + "', '" + text + "', '');");
        }
    });
}

/// What a look at the ledger costs, alone or while events are recorded.
Figures readLedger(bool whileRecording) {
    constexpr int reads = 200'000;
    const test::TemporaryDocuments documents;
    const auto uploads = backupOnly("ledger", batchSize);
    Host host(uploads);
    for (int i = 0; i < events; ++i) host.tracker->submit<ScreenView>();
    if (!whileRecording) host.drain();
    std::int64_t accepted = 0;
    const auto before = nanoseconds();
    for (int i = 0; i < reads; ++i) accepted += uploads->ledger().acceptedInRun;
    const auto elapsed = static_cast<double>(nanoseconds() - before);
    host.drain();
    return {{"ns/read", accepted < 0 ? 0 : elapsed / reads}};
}

}  // namespace

void addDurableBenchmarks() {
    const std::string single = "durable/one at a time, batch of 50", group = "durable/one at a time, group of 5000";
    add(
        single, [] { return oneAtATime(0); }, 3);
    add(single + "~bare SQLite, same row", bareRewrites, 3);
    add(single + "~bare insert of 400 bytes", bareInserts, 3);
    setBar(single + "~bare SQLite, same row", "us/event", 1.25);
    add(
        group, [] { return oneAtATime(5'000); }, 3);
    add(
        group + "~batch of 50", [] { return oneAtATime(0); }, 3);
    setBar(group + "~batch of 50", "us/event", 1.25);
    const std::string powerCut = "durable/one at a time, power cut";
    add(
        powerCut, [] { return oneAtATime(0, Durability::powerCut); }, 3);
    add(
        powerCut + "~process kill", [] { return oneAtATime(0); }, 3);
    add(
        "ledger/read", [] { return readLedger(false); }, 3);
    add(
        "ledger/read, while events are recorded", [] { return readLedger(true); }, 3);
}

}  // namespace corvane::bench
