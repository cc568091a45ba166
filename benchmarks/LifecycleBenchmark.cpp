// Start and end of sessions.

#include "benchmarks/Allocations.h"
#include "benchmarks/BareSQLite.h"
#include "benchmarks/Host.h"
#include "benchmarks/Samples.h"
#include "benchmarks/Suites.h"
#include "benchmarks/Table.h"

#include "tests/support/Files.h"

#include <corvane/Store/DeferredStore.h>
#include <corvane/Testing/TemporaryDocuments.h>
#include <corvane/Upload/SignedEntity.h>
#include <corvane/Upload/UploadDropbox.h>

namespace corvane::bench {

namespace {

constexpr int waitingRows = 10'000, waitingDocuments = 100'000;

/// An endpoint that no row can be sent to at once: what waits is looked at and stays.
std::shared_ptr<UploadBatchEventProcessor> uploads(const std::string& name) {
    return std::make_shared<UploadBatchEventProcessor>(Client{"com.example.bench", "Bench", "1.0", 1},
                                                       Endpoint{"http://127.0.0.1:1/in", name});
}

double millisecondsSince(std::int64_t before) {
    return static_cast<double>(nanoseconds() - before) / 1e6;
}

/// From the session manager's construction until the first event is in the database.
Figures start(const std::string& endpoint) {
    const auto before = nanoseconds();
    SessionManager sessions;
    sessions.processorManager()->add(uploads(endpoint));
    sessions.start(Session::Kind::userEvents());
    std::promise<double> held, durable, ended;
    sessions.tracker()->transaction([&](AccessTracker&) { held.set_value(millisecondsSince(before)); });
    sessions.tracker()->push(home);
    sessions.tracker()->submit<ScreenView>(
        [&](const EventSubmitResult&) { durable.set_value(millisecondsSince(before)); });
    Figures figures{{"ms to session start", held.get_future().get()},
                    {"ms to first durable event", durable.get_future().get()}};
    std::int64_t ending = 0;
    sessions.tracker()->transaction([&](AccessTracker&) { ending = nanoseconds(); });
    sessions.end([&] { ended.set_value(millisecondsSince(ending)); });
    figures["ms queue held by the end"] = ended.get_future().get();
    return figures;
}

/// Rows of uploads that failed before.
void leaveRows(const std::string& endpoint, int count) {
    DeferredStore<SignedEntity> store(endpoint);
    store.perform([count](Store<SignedEntity>& rows) {
        rows.open();
        rows.createTable();
        rows.transaction([&] {
            for (int i = 0; i < count; ++i) {
                SignedEntity row;
                row.identifier = "document " + std::to_string(i);
                rows.insert(row);
            }
        });
        rows.close();
    });
}

/// ... with their payloads.
void leaveDocuments(const std::string& endpoint, int count) {
    leaveRows(endpoint, count);
    const UploadDropbox dropbox(endpoint, false);
    std::filesystem::create_directories(dropbox.baseURL());
    const std::string payload(400, 'x');
    for (int i = 0; i < count; ++i) test::writeFile(dropbox.baseURL() / ("document " + std::to_string(i)), payload);
}

}  // namespace

void addLifecycleBenchmarks() {
    add("session/cold start", [] {
        const test::TemporaryDocuments documents;
        return start("cold");
    });
    add("session/cold start~bare SQLite", [] {
        const test::TemporaryDocuments documents;
        const auto before = nanoseconds();
        BareSQLite database(documents / "bare.db");
        database.run(BareSQLite::rowOf("7B7D"));
        return Figures{{"ms to first durable event", millisecondsSince(before)}};
    });
    add(
        "session/start with 10000 rows, payloads gone",
        [] {
            const test::TemporaryDocuments documents;
            leaveRows("waiting", waitingRows);
            return start("waiting");
        },
        3);
    add(
        "session/start with 100000 documents waiting",
        [] {
            const test::TemporaryDocuments documents;
            leaveDocuments("waiting", waitingDocuments);
            Allocations::restartPeak();
            const auto before = Allocations::now();
            Figures figures = start("waiting");
            figures["MB allocated at most"] = static_cast<double>(Allocations::now().peak - before.inUse) / 1e6;
            return figures;
        },
        1);
    add("session/first store use after an end", [] {
        const test::TemporaryDocuments documents;
        start("reopened");
        DeferredStore<SignedEntity> store("reopened");
        store.perform([](Store<SignedEntity>&) {});
        const auto before = nanoseconds();
        store.perform([](Store<SignedEntity>& rows) { static_cast<void>(rows.fetchAll()); });
        return Figures{{"ms", millisecondsSince(before)}};
    });
}

}  // namespace corvane::bench
