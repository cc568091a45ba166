// An endpoint's database as a start finds it: any values in the rows of any of its tables.

#include <corvane/Processing/UploadBatches.h>
#include <corvane/Store/EpochEntity.h>
#include <corvane/Testing/TemporaryDocuments.h>
#include <corvane/Upload/UploadManager.h>

#include "fuzz/FuzzTarget.h"
#include "tests/support/FakeUploadService.h"

using namespace corvane;

namespace {

/// Has a payload for every document.
struct Payloads final : UploadDropboxType {
    std::filesystem::path write(std::string_view, std::string_view, const ResourceType& resource) override {
        const JSON document = JSON::fromEncodedText(resource.jsonObject().text());
        CORVANE_REQUIRE(document.isObject(), "a document is no JSON");
        hasMarked = hasMarked || document.text().find(R"("marked":1)") != std::string::npos;
        return FUZZ_BODY;
    }
    void finish(std::string_view, const std::optional<UploadResponse>&) override {}
    std::optional<std::filesystem::path> existingFile(std::string_view) override { return FUZZ_BODY; }
    bool hasMarked = false;
};

template <class Action>
void asFarAsItGoes(const Action& action) {
    try {
        action();
    } catch (const StoreError&) {  // the table's own rules, or a foreign one without a key
    }
}

/// Makes a table as this library does, or with the same columns of no type, and rows for it.
template <class Entity>
void fill(FuzzedDataProvider& in, StoreConnection& connection, std::initializer_list<std::string_view> usual) {
    const auto& table = Store<Entity>::table();
    connection.run(table.dropSQL());
    std::string columns, separator;
    for (const auto& column : table.columns()) columns += std::exchange(separator, ", ") + column.name;
    if (in.ConsumeBool()) connection.run("CREATE TABLE " + table.name() + " (" + columns + ");");
    connection.createTable(table);
    for (auto rows = in.ConsumeIntegralInRange(0, 4); rows > 0; --rows) {
        std::string values = fuzz::anyLiteral(in, usual);
        for (auto i = table.columns().size(); i > 1; --i) values += ", " + fuzz::anyLiteral(in, usual);
        asFarAsItGoes([&] { connection.run("INSERT INTO " + table.name() + " VALUES (" + values + ");"); });
    }
}

/// What a session's start makes of the rows, and the end of what it sends.
void start(FuzzedDataProvider& in, const std::shared_ptr<DeferredStore<SignedEntity>>& uploads,
           const std::shared_ptr<DeferredStore<UploadBatchEntity>>& backups) {
    const auto service = std::make_shared<test::FakeUploadService>();
    const auto payloads = std::make_shared<Payloads>();
    const auto ledger = std::make_shared<DeliveryLedger>();
    const auto book = std::make_shared<LedgerBook>();
    const auto access = std::make_shared<SerialQueue>("access");
    StorageLimits limits{.maximumBytes = std::numeric_limits<std::int64_t>::max()};
    const bool isBounded = in.ConsumeBool();
    if (isBounded) limits = {in.ConsumeIntegral<std::uint16_t>(), std::chrono::milliseconds(in.ConsumeIntegral<int>())};
    const auto manager = UploadManager::create(service, uploads, payloads, ledger, book, std::nullopt, limits);
    const auto batches = std::make_shared<UploadBatches>(Client{"a", "a", "1", 1}, manager, backups,
                                                         UploadBatchEventConfig::default_(), ledger, book);
    batches->registerAccessQueue(access);
    access->sync([&] { batches->didStartSession({"S", Session::Kind::userEvents(), now(), JSON("{}")}); });
    CORVANE_REQUIRE(payloads->hasMarked, "a batch that can be read was not handed over");
    service->resubmitted.push_back(service->submitted);
    bool hasSent = false;
    for (const auto& requests : service->resubmitted) {
        for (const auto& [identifier, type, agent, file] : requests) {
            hasSent = hasSent || identifier == "marked";
            const auto after = Date(Date::duration(in.ConsumeIntegral<std::int64_t>()));
            service->complete(in.ConsumeBool()
                                  ? UploadResult::retry(identifier, after)
                                  : UploadResult::failed(identifier, {in.ConsumeIntegralInRange(200, 599)}));
        }
    }
    // The bounds may have it: this service does not say that it can go.
    CORVANE_REQUIRE(hasSent || isBounded, "a document that can be sent was not");
    manager->readLedger();
    CORVANE_REQUIRE(book->ledger().unaccounted == 0, "the run does not balance");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const test::TemporaryDocuments documents;  // for nothing but the switch
    Log::shared().setLevel(LogLevel::debug);
    Log::shared().setSink([](LogLevel, std::string_view text) {
        CORVANE_REQUIRE(jsontext::isUTF8(text), "a message of the log is not UTF-8");
    });
    // Made once: a store is made on a thread of its own.
    static const auto uploads = std::make_shared<DeferredStore<SignedEntity>>(std::nullopt);
    static const auto backups = std::make_shared<DeferredStore<UploadBatchEntity>>(std::nullopt);
    FuzzedDataProvider in(data, size);
    uploads->perform([&](Store<SignedEntity>& store) {
        auto& connection = *store.connection();
        fill<SignedEntity>(in, connection, {"'a'", "'b'", "4", "1e9"});
        fill<DocumentEntity>(in, connection, {"'a'", "'b'", "'marked'"});
        fill<LedgerEntity>(in, connection, {"'delivered'", "'refused 4xx'", "'sent again'", "'not accepted: other'"});
        fill<EpochEntity>(in, connection, {"'signed_requests'", "'upload_batches'"});
        // Of rows of one name, which no table of the library's own has, the first one counts.
        connection.run("DELETE FROM signed_requests WHERE identifier = 'marked';");
        connection.run("INSERT INTO signed_requests VALUES ('marked', 1e9, 't', 'u', 0, 1e9, NULL);");
    });
    backups->perform([&](Store<UploadBatchEntity>& store) {
        fill<UploadBatchEntity>(
            in, *store.connection(),
            {"'a'", R"('{"events":[{}]}')", R"('{"sessionID":"S"}')", R"('{"events":[{"a":[1.5]},{"b":"\u00e9"}]}')"});
        store.connection()->run("DELETE FROM upload_batches WHERE identifier = 'last';");
        store.connection()->run(R"(INSERT INTO upload_batches VALUES ('last', '{"events":[{"marked":1}]}', '{}');)");
    });
    start(in, uploads, backups);
    uploads->perform([&](Store<SignedEntity>& store) {
        asFarAsItGoes([&] { store.transaction([&] { forgetBefore(1, store.connection(), store.table()); }); });
    });
    return 0;
}
