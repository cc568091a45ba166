// Documents to a server on the loopback address.

#include "benchmarks/BareSQLite.h"
#include "benchmarks/BareUpload.h"
#include "benchmarks/Host.h"
#include "benchmarks/Samples.h"
#include "benchmarks/Suites.h"
#include "benchmarks/Table.h"

#include "tests/support/Files.h"

#include <corvane/Processing/EncodedEvents.h>
#include <corvane/Processing/UserEvents.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Testing/TemporaryDocuments.h>
#include <corvane/Upload/OstrelSigner.h>
#include <corvane/Upload/SignedEntity.h>
#include <corvane/Upload/UploadDropbox.h>
#include <corvane/Upload/UploadManager.h>
#include <corvane/Upload/UploadRequest.h>
#include <corvane/Upload/UploadService.h>

#include <stdexcept>

namespace corvane::bench {

namespace {

constexpr int documents = 400, eventsEach = 50;

std::shared_ptr<const EncodedEvents> makeEvents() {
    Host host;
    auto events = std::make_shared<EncodedEvents>();
    for (int i = 0; i < eventsEach; ++i) {
        events->append(ProcessEvent("ScreenView", JSON(host.eventText()), std::nullopt).payload());
    }
    return events;
}

template <class Work>
Figures perDocument(Work&& work) {
    const auto before = nanoseconds();
    const double cpu = cpuNanoseconds();
    work();
    const double elapsed = static_cast<double>(nanoseconds() - before);
    return {{"documents/s", documents * 1e9 / elapsed},
            {"CPU us/document", (cpuNanoseconds() - cpu) / 1e3 / documents}};
}

/// From the finished batch to the server's answer, with the row and the payload file written and removed.
Figures throughManager(const std::string& url) {
    const test::TemporaryDocuments directory;
    const Endpoint endpoint{url, "upload"};
    const auto ledger = std::make_shared<DeliveryLedger>();
    const auto queue = std::make_shared<SerialQueue>("bench");
    const auto manager =
        UploadManager::create(std::make_shared<UploadService>(endpoint, std::make_shared<OstrelSigner>()),
                              std::make_shared<DeferredStore<SignedEntity>>(endpoint.name()),
                              std::make_shared<UploadDropbox>(endpoint.name(), false), ledger);
    const auto events = makeEvents();
    const Client client{"com.example.bench", "Bench", "1.0", 1};
    const JSON session(R"({"sessionID":"7E7C6B0E-0000-4000-8000-000000000001"})");
    queue->sync([&] {
        manager->registerAccessQueue(queue);
        manager->open();
    });
    auto figures = perDocument([&] {
        for (int i = 0; i < documents; ++i) {
            queue->sync([&] {
                const auto document =
                    std::make_shared<UserEvents>(session, UserEvents::Events{events}, "document " + std::to_string(i));
                ledger->add(document->identifier(), eventsEach);
                manager->upload(UploadRequest{client, document});
            });
        }
        const auto report = ledger->wait(std::chrono::steady_clock::now() + std::chrono::seconds(60));
        if (report.delivered.documents != documents) throw std::runtime_error("documents were not delivered");
    });
    queue->sync([&] { manager->close(); });
    return figures;
}

/// @param survives write the compressed document to a file and a row to a database first, and remove both afterwards,
///                 as whoever wants to send it again after a crash must.
Figures bareUploads(const std::string& url, bool survives) {
    const test::TemporaryDocuments directory;
    BareSQLite database(directory / "bare.db");
    const auto payload = directory / "payload", partial = directory / "partial";
    BareUpload bare;
    const std::string text =
        UserEvents(JSON(R"({"sessionID":"7E7C6B0E"})"), {makeEvents()}, "document").jsonObject().text();
    return perDocument([&] {
        for (int i = 0; i < documents; ++i) {
            const std::string body = BareUpload::gzip(text);
            if (survives) {
                test::writeFile(partial, body);
                std::filesystem::rename(partial, payload);
                database.run(BareSQLite::rowOf("7B7D"));
            }
            if (!bare.send(url, body)) throw std::runtime_error("a document was not delivered");
            if (survives) {
                database.run(BareSQLite::deletionOfRow());
                std::filesystem::remove(payload);
            }
        }
    });
}

}  // namespace

void addUploadBenchmarks(const std::string& serverURL) {
    const std::string name = "upload/document of 50 events", url = serverURL + "/in";
    add(
        name, [=] { return throughManager(url); }, 3);
    add(
        name + "~gzip, SHA-1, signature, libcurl", [=] { return bareUploads(url, false); }, 3);
    add(
        name + "~the same, a file and a row", [=] { return bareUploads(url, true); }, 3);
    setBar(name + "~gzip, SHA-1, signature, libcurl", "CPU us/document", 1.25);
}

}  // namespace corvane::bench
