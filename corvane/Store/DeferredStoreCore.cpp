#include <corvane/Store/DeferredStoreCore.h>

#include <corvane/Platform/Log.h>
#include <corvane/Platform/RecordingSwitch.h>
#include <corvane/Store/EpochEntity.h>
#include <corvane/Store/Store.h>
#include <corvane/Store/VersionEntity.h>

#include <utility>

namespace corvane {

namespace {

std::optional<std::int64_t> versionOnDisk(Store<VersionEntity>& versions, const std::string& table) {
    const auto rows = versions.fetchWhere("entityName", table);
    if (rows.empty()) return std::nullopt;
    return rows.front().entityVersion;
}

std::string description(std::optional<std::int64_t> version) {
    return version ? "Optional(" + std::to_string(*version) + ")" : "nil";
}

void bringToVersion(const std::shared_ptr<StoreConnection>& connection, const StoreTable& table, std::int64_t version) {
    auto& log = Log::shared();
    Store<VersionEntity> versions(connection);
    versions.createTable();

    log.default_("Attempting to create on disk version for tableName=%@", table.name());
    const auto diskVersion = versionOnDisk(versions, table.name());
    if (diskVersion != version) {
        log.default_(
            "Store version on disk is different than source, must drop the table since migrations are not supported, "
            "table=%@, diskVersion=%@, currentVersion=%ld",
            table.name(), description(diskVersion), version);
        connection->run(table.dropSQL());
    }

    log.default_("Updating disk version for tableName=%@, version=%ld", table.name(), version);
    versions.insert({table.name(), version});
}

void openVersioned(const std::shared_ptr<StoreConnection>& connection, const StoreTable& table, std::int64_t version) {
    Log::shared().default_("Attempting to create version store");
    // Two processes may make the file at the same moment: neither may drop a table by what it read before the other
    // made it.
    connection->transaction([&] { bringToVersion(connection, table, version); });
}

std::shared_ptr<StoreConnection> fallBack(const StoreTable& table, const std::exception& error) {
    Log::shared().error("Failed to create store for %{public}@, error=%{public}@. Attempt fallback to in-memory",
                        table.name(), error.what());
    return std::make_shared<StoreConnection>(StoreLocation::memory());
}

std::shared_ptr<StoreConnection> openOrFallBack(const StoreTable& table, std::int64_t version,
                                                const StoreLocation& location, Durability durability) {
    try {
        Log::shared().default_("Attempting to create store, tableName=%@", table.name());
        auto connection = std::make_shared<StoreConnection>(location, durability);
        openVersioned(connection, table, version);
        return connection;
    } catch (const std::exception& error) {
        return fallBack(table, error);
    }
}

}  // namespace

DeferredStoreError::DeferredStoreError(Code code)
    : Error("Corvane.DeferredStore.Errors", code,
            "there is no store: neither on disk nor in memory could one be made") {}
DeferredStoreError::~DeferredStoreError() = default;

SerialQueue& DeferredStoreCore::queue() {
    static auto& queue =
        *new SerialQueue("com.veskar.corvane.deferred-store.queue", SerialQueue::QualityOfService::background);
    return queue;
}

std::shared_ptr<DeferredStoreCore> DeferredStoreCore::make(const StoreTable& table, std::int64_t schemaVersion,
                                                           std::optional<std::string> location, Durability durability) {
    std::shared_ptr<DeferredStoreCore> made(new DeferredStoreCore(table, schemaVersion));
    auto place = location ? StoreLocation::default_(*std::move(location)) : StoreLocation::memory();
    queue().async([weak = std::weak_ptr(made), place = std::move(place), durability] {
        const auto core = weak.lock();
        if (!core) return;
        queue().assertCurrent("DeferredStoreCore::make");
        try {
            core->connection_ = openOrFallBack(core->table_, core->schemaVersion_, place, durability);
        } catch (const std::exception& error) {
            Log::shared().default_("Failed to create deferred store, error=%{public}@", error.what());
        }
    });
    return made;
}

DeferredStoreCore::~DeferredStoreCore() {
    if (connection_) queue().async([connection = std::move(connection_)]() mutable { connection.reset(); });
}

const std::shared_ptr<StoreConnection>& DeferredStoreCore::connection() {
    queue().assertCurrent("DeferredStoreCore::connection");
    if (!connection_) throw DeferredStoreError(DeferredStoreError::noStore);
    lost_.reset();
    RecordingSwitch::look();
    if (connection_->hasLostItsFile()) {
        lost_ = connection_->location();
        makeAnew();
    }
    if (RecordingSwitch::epoch() > epoch_) transaction([] {});
    return connection_;
}

void DeferredStoreCore::perform(FunctionRef<void(const std::shared_ptr<StoreConnection>&)> operation) {
    queue().sync([&] {
        operation(connection());
        throwIfFileWasLost();
    });
}

void DeferredStoreCore::transaction(FunctionRef<void()> operations) {
    queue().assertCurrent("DeferredStoreCore::transaction");
    const auto before = epoch_;
    try {
        connection_->transaction([&] {
            queue().assertCurrent("DeferredStoreCore::transaction");
            keepUp();
            operations();
        });
    } catch (...) {
        epoch_ = before;
        throw;
    }
}

void DeferredStoreCore::keepUp() {
    RecordingSwitch::look();
    const auto epoch = RecordingSwitch::epoch();
    if (epoch <= epoch_) return;
    forgetBefore(epoch, connection_, table_);
    epoch_ = epoch;
}

// With its version and its table: a table without its version would be dropped, rows and all, by the next run.
void DeferredStoreCore::makeAnew() {
    const bool wasOpen = connection_->isOpen();
    try {
        connection_->reopen();
        openVersioned(connection_, table_, schemaVersion_);
    } catch (const std::exception& error) {
        connection_ = fallBack(table_, error);
    }
    connection_->createTable(table_);
    epoch_ = 0;
    if (!wasOpen) connection_->close();
}

bool DeferredStoreCore::sharesFileWith(const StoreConnection& other) const {
    queue().assertCurrent("DeferredStoreCore::sharesFileWith");
    return connection_ && connection_->sharesFileWith(other);
}

bool DeferredStoreCore::isInMemory() const {
    queue().assertCurrent("DeferredStoreCore::isInMemory");
    return !connection_ || connection_->location().isMemory();
}

void DeferredStoreCore::throwIfFileWasLost() const {
    queue().assertCurrent("DeferredStoreCore::throwIfFileWasLost");
    if (lost_) {
        throw StoreError::makeCantOpen(*lost_,
                                       "its file was removed or replaced while it was in use; what it held is lost");
    }
}

}  // namespace corvane
