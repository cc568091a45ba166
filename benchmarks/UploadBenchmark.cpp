// Documents to a server on the loopback address.

#include "benchmarks/AgentProcess.h"
#include "benchmarks/BareDocuments.h"
#include "benchmarks/BareSQLite.h"
#include "benchmarks/BareUpload.h"
#include "benchmarks/Host.h"
#include "benchmarks/Samples.h"
#include "benchmarks/Suites.h"
#include "benchmarks/Table.h"

#include "tests/support/Files.h"

#include <corvane/Platform/Date.h>
#include <corvane/Platform/Descriptor.h>
#include <corvane/Platform/UUID.h>
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

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <stdexcept>
#include <string_view>
#include <utility>
#include <vector>

namespace corvane::bench {

namespace {

constexpr int documents = 400, eventsEach = 50;
constexpr const char* sessionText = R"({"sessionID":"7E7C6B0E-0000-4000-8000-000000000001"})";

void writeNewFile(const std::string& path, std::string_view contents) {
    const Descriptor file(open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
    if (!file || write(file.get(), contents.data(), contents.size()) != static_cast<ssize_t>(contents.size())) {
        throw std::runtime_error("no file was written");
    }
}

std::shared_ptr<const EncodedEvents> makeEvents() {
    Host host;
    auto events = std::make_shared<EncodedEvents>();
    for (int i = 0; i < eventsEach; ++i) {
        events->append(ProcessEvent("ScreenView", JSON(host.eventText()), std::nullopt).payload());
    }
    return events;
}

/// @param cpu the nanoseconds of CPU time that count
template <class CPU, class Work>
Figures perDocument(CPU&& cpu, Work&& work) {
    const auto before = nanoseconds();
    const double cpuBefore = cpu();
    work();
    const double elapsed = static_cast<double>(nanoseconds() - before);
    return {{"documents/s", documents * 1e9 / elapsed}, {"CPU us/document", (cpu() - cpuBefore) / 1e3 / documents}};
}

/// What takes documents over from a batching processor, and the session's queue.
class Uploads {
  public:
    explicit Uploads(const std::string& url, TransferSession::Factory factory = {},
                     Durability durability = Durability::processKill)
        : endpoint_{url, "upload"}, durability_(durability) {
        manager_ = UploadManager::create(
            std::make_shared<UploadService>(endpoint_, std::make_shared<OstrelSigner>(), std::move(factory)),
            std::make_shared<DeferredStore<SignedEntity>>(endpoint_.name(), durability_),
            std::make_shared<UploadDropbox>(endpoint_.name(), false), ledger_);
        queue_->sync([this] {
            manager_->registerAccessQueue(queue_);
            manager_->open();
        });
        send(10);  // so that everything is there that is made once
    }
    Uploads(const Uploads&) = delete;
    Uploads& operator=(const Uploads&) = delete;
    ~Uploads() {
        queue_->sync([this] { manager_->close(); });
    }

    /// From the finished batches to the server's answers, with row and payload written and removed, all on the
    /// session's queue, as a processor does it.
    void send(int count) {
        const auto before = ledger_->wait(std::chrono::steady_clock::now()).delivered.documents;
        for (int i = 0; i < count; ++i) queue_->async([this] { upload(); });
        queue_->sync([] {});
        const auto report = ledger_->wait(std::chrono::steady_clock::now() + std::chrono::seconds(60));
        if (report.delivered.documents != before + count) throw std::runtime_error("documents were not delivered");
    }

  private:
    void upload() {
        const auto document = std::make_shared<UserEvents>(session_, UserEvents::Events{events_}, newUUID());
        ledger_->add(document->identifier(), eventsEach);
        UploadRequest request{client_, document};
        request.durability = durability_;
        manager_->upload(request);
    }

    const Endpoint endpoint_;
    const Durability durability_;
    const Client client_{"com.example.bench", "Bench", "1.0", 1};
    const JSON session_{sessionText};
    const std::shared_ptr<const EncodedEvents> events_ = makeEvents();
    const std::shared_ptr<DeliveryLedger> ledger_ = std::make_shared<DeliveryLedger>();
    const std::shared_ptr<SerialQueue> queue_ = std::make_shared<SerialQueue>("bench");
    std::shared_ptr<UploadManager> manager_;
};

Figures inProcess(const std::string& url, Durability durability) {
    const test::TemporaryDocuments directory;
    Uploads uploads(url, {}, durability);
    return perDocument(cpuNanoseconds, [&] { uploads.send(documents); });
}

/// The text of a document's row, and of its deletion.
std::pair<std::string, std::string> statements() {
    const auto& table = Store<SignedEntity>::table();
    const SignedEntity entity{.identifier = newUUID(),
                              .createdDate = now(),
                              .contentType = "application/vnd.veskar.user-events+json; version=0.1.0",
                              .userAgent = "com.example.bench/1.0.1",
                              .retries = 0,
                              .retryAfterDate = now(),
                              .signature = ""};
    std::vector<StorableValue> values;
    for (const auto& column : table.columns()) values.push_back(entity.storableValue(column.name));
    return {table.insertSQL(values), table.deleteSQL("identifier", entity.identifier)};
}

#ifdef CORVANE_AGENT
/// What the host and the agent take together.
Figures withAgent(const std::string& url) {
    const AgentProcess agent;
    Uploads uploads(url, agent.sessions());
    return perDocument([&] { return cpuNanoseconds() + agent.cpuNanoseconds(); }, [&] { uploads.send(documents); });
}
#endif

}  // namespace

Figures bareDocuments(const std::string& url, bool survives) {
    const test::TemporaryDocuments directory;
    BareSQLite database(directory / "bare.db");
    database.run(Store<SignedEntity>::table().createSQL());
    const auto [insertion, deletion] = statements();
    const std::string payload = directory / "payload", partial = directory / "partial";
    BareUpload bare(url);
    std::string text = UserEvents(JSON(sessionText), {makeEvents()}, newUUID()).jsonObject().text();
    const auto identifier = text.find(R"("identifier":")") + 14;
    return perDocument(cpuNanoseconds, [&] {
        for (int i = 0; i < documents; ++i) {
            text.replace(identifier, 36, newUUID());
            const auto body = bare.gzip(text);
            if (survives) {
                writeNewFile(partial, body);
                std::rename(partial.c_str(), payload.c_str());
                database.run(insertion);
            }
            if (!bare.send(body)) throw std::runtime_error("a document was not delivered");
            if (survives) {
                database.run(deletion);
                std::remove(payload.c_str());
            }
        }
    });
}

void addUploadBenchmarks(const std::string& serverURL) {
    const std::string url = serverURL + "/in", survives = "~the same, a file and a row";
    const auto addWith = [&](const std::string& name, Figures (*measure)(const std::string&), double bar) {
        add(
            name, [=] { return measure(url); }, 3);
        add(
            name + "~gzip, SHA-1, signature, libcurl", [=] { return bareDocuments(url, false); }, 3);
        add(
            name + survives, [=] { return bareDocuments(url, true); }, 3);
        setBar(name + survives, "CPU us/document", bar);
    };
    const auto killed = [](const std::string& to) { return inProcess(to, Durability::processKill); };
    const std::string powerCut = "upload/document, power cut";
    add(
        powerCut, [=] { return inProcess(url, Durability::powerCut); }, 3);
    add(
        powerCut + "~process kill", [=] { return killed(url); }, 3);
    addWith("upload/document of 50 events", killed, 1.25);
#ifdef CORVANE_AGENT
    addWith("upload/document with the agent", withAgent, 2.5);
#endif
}

}  // namespace corvane::bench
