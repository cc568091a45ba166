// Start and end of sessions.

#include "benchmarks/BareSQLite.h"
#include "benchmarks/Host.h"
#include "benchmarks/Samples.h"
#include "benchmarks/Suites.h"
#include "benchmarks/Table.h"

#include <corvane/Store/DeferredStore.h>
#include <corvane/Testing/TemporaryDocuments.h>
#include <corvane/Upload/SignedEntity.h>

namespace corvane::bench {

namespace {

constexpr int waitingRows = 10'000;

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

/// Rows of uploads that failed before, with payload files that are gone: the first start looks at and drops them all.
void leaveRows(const std::string& endpoint) {
    DeferredStore<SignedEntity> store(endpoint);
    store.perform([](Store<SignedEntity>& rows) {
        rows.open();
        rows.createTable();
        rows.transaction([&] {
            for (int i = 0; i < waitingRows; ++i) {
                SignedEntity row;
                row.identifier = "document " + std::to_string(i);
                rows.insert(row);
            }
        });
        rows.close();
    });
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
        "session/start with 10000 rows waiting",
        [] {
            const test::TemporaryDocuments documents;
            leaveRows("waiting");
            return start("waiting");
        },
        3);
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
