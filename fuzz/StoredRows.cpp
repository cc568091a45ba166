// An endpoint's database as a start finds it: any values in the rows of any of its tables.

#include <corvane/Processing/UploadBatches.h>
#include <corvane/Store/EpochEntity.h>
#include <corvane/Store/VersionEntity.h>
#include <corvane/Testing/TemporaryDocuments.h>
#include <corvane/Upload/UploadManager.h>

#include "fuzz/FuzzTarget.h"
#include "fuzz/Rows.h"
#include "tests/support/FakeUploadService.h"

#include <algorithm>

namespace {

using namespace corvane;

/// Has a payload for every document.
class Payloads final : public UploadDropboxType {
  public:
    std::filesystem::path write(std::string_view, std::string_view, const ResourceType& resource) override {
        const auto text = resource.jsonObject().text();
        CORVANE_REQUIRE(JSON::fromEncodedText(text).isObject(), "a document is no JSON");
        hasMarked = hasMarked || text.find(R"("marked":1)") != std::string::npos;
        return payload;
    }
    void finish(std::string_view, const std::optional<UploadResponse>&) override {}
    std::optional<std::filesystem::path> existingFile(std::string_view) override { return payload; }

    const std::filesystem::path payload = "/proc/self/exe";
    bool hasMarked = false;  // there was a document with the event of the last row
};

/// A table with the given rows, made by this library, or with the same columns of no type by somebody else.
template <class Entity>
void fill(FuzzedDataProvider& in, StoreConnection& connection, std::initializer_list<std::string_view> usual) {
    const auto& table = Store<Entity>::table();
    std::string columns;
    for (const auto& column : table.columns()) columns += (columns.empty() ? "" : ", ") + column.name;
    connection.run(table.dropSQL());
    if (in.ConsumeBool()) {
        connection.run("CREATE TABLE " + table.name() + " (" + columns + ");");
    } else {
        connection.createTable(table);
    }
    for (auto rows = in.ConsumeIntegralInRange(0, 4); rows > 0; --rows) {
        std::string sql;
        for (std::size_t i = 0; i < table.columns().size(); ++i) {
            sql += (sql.empty() ? "" : ", ") + fuzz::anyLiteral(in, usual);
        }
        try {
            connection.run("INSERT INTO " + table.name() + " VALUES (" + sql + ");");
        } catch (const StoreError&) {  // the table's own rules
        }
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
    StorageLimits limits;
    if (in.ConsumeBool()) limits.maximumAge = std::chrono::milliseconds(in.ConsumeIntegral<std::uint32_t>());
    const auto manager = UploadManager::create(service, uploads, payloads, ledger, book, std::nullopt, limits);
    const auto batches = std::make_shared<UploadBatches>(Client{"a", "a", "1", 1}, manager, backups,
                                                         UploadBatchEventConfig::default_(), ledger, book);
    batches->registerAccessQueue(access);
    access->sync([&] { batches->didStartSession({"S", Session::Kind::userEvents(), now(), JSON("{}")}); });
    CORVANE_REQUIRE(payloads->hasMarked, "a row that can be read was not handed over");
    std::set<std::string> sent;
    for (const auto& requests : service->resubmitted) {
        for (const auto& request : requests) sent.insert(request.identifier);
    }
    CORVANE_REQUIRE(sent.contains("marked") || limits.maximumAge || book->ledger().givenUp.size.documents > 0,
                    "a document that can be sent was not");
    for (const auto& request : service->submitted) sent.insert(request.identifier);
    for (const auto& identifier : sent) {
        const UploadResponse answer{in.ConsumeIntegralInRange(200, 599)};
        const auto after = Date(Date::duration(in.ConsumeIntegral<std::int64_t>()));
        service->complete(in.ConsumeBool() ? UploadResult::retry(identifier, after)
                                           : UploadResult::failed(identifier, answer));
    }
    manager->readLedger();
    CORVANE_REQUIRE(book->ledger().unaccounted == 0, "the run does not balance");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const test::TemporaryDocuments documents;  // for nothing but the switch
    fuzz::checkLog();
    FuzzedDataProvider in(data, size);
    // Made once: a store is made on a thread of its own.
    static const auto uploads = std::make_shared<DeferredStore<SignedEntity>>(std::nullopt);
    static const auto backups = std::make_shared<DeferredStore<UploadBatchEntity>>(std::nullopt);
    uploads->perform([&](Store<SignedEntity>& store) {
        auto& connection = *store.connection();
        fill<SignedEntity>(in, connection, {"'a'", "'b'", "4", "1e9"});
        fill<DocumentEntity>(in, connection, {"'a'", "'b'", "'marked'"});
        fill<LedgerEntity>(in, connection, {"'delivered'", "'refused 4xx'", "'sent again'", "'not accepted: other'"});
        fill<EpochEntity>(in, connection, {"'signed_requests'", "'upload_batches'"});
        fill<VersionEntity>(in, connection, {"'signed_requests'", "'upload_batches'"});
        connection.run("INSERT INTO signed_requests VALUES ('marked', 1e9, 't', 'u', 0, 1e9, NULL);");
    });
    backups->perform([&](Store<UploadBatchEntity>& store) {
        fill<UploadBatchEntity>(
            in, *store.connection(),
            {R"('{"events":[{}]}')", R"('{"events":[{"a":[1.5]},{}]}')", R"('{"sessionID":"S"}')", "'a'", "'b'"});
        store.connection()->run(R"(INSERT INTO upload_batches VALUES ('last', '{"events":[{"marked":1}]}', '{}');)");
    });
    start(in, uploads, backups);
    for (const std::int64_t epoch : {1, 2}) {
        try {
            uploads->perform([&](Store<SignedEntity>& store) {
                store.transaction([&] { forgetBefore(epoch, store.connection(), store.table()); });
            });
        } catch (const Error& error) {
            CORVANE_REQUIRE(*error.what(), "an error says nothing");
        }
    }
    return 0;
}
