#include <corvane/Store/StoreConnection.h>

#include <corvane/Platform/DocumentsDirectory.h>

#include <fcntl.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <filesystem>
#include <utility>

namespace corvane {

namespace {

constexpr int openFlags = SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE | SQLITE_OPEN_FULLMUTEX;
static_assert(openFlags == 0x10006);
constexpr int impatientMilliseconds = 10;
std::atomic<int> busyTimeoutMilliseconds = 5000;

struct CloseDatabase {
    void operator()(sqlite3* database) const noexcept { sqlite3_close_v2(database); }
};
struct FinalizeStatement {
    void operator()(sqlite3_stmt* statement) const noexcept { sqlite3_finalize(statement); }
};
using Database = std::unique_ptr<sqlite3, CloseDatabase>;
using Statement = std::unique_ptr<sqlite3_stmt, FinalizeStatement>;

/// Creates the file so that it is private from its first moment; the database gives its side files the same mode. An
/// error here shows again, with its reason, when the database is opened. A symbolic link that leads nowhere is refused:
/// the database would make its target, readable for everybody.
void precreatePrivately(const std::string& path) {
    const int descriptor = ::open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, 0600);
    if (descriptor >= 0) {
        ::close(descriptor);
        return;
    }
    struct stat status {};
    if (::stat(path.c_str(), &status) != 0 && ::lstat(path.c_str(), &status) == 0 && S_ISLNK(status.st_mode)) {
        throw InvalidArgument(path + " is a symbolic link that leads nowhere");
    }
}

}  // namespace

struct StoreConnection::Handle {
    Database database;
    Statement begin = nullptr, commit = nullptr;  // kept: every write is in a transaction
};

/// Opens a closed connection for its own lifetime.
class StoreConnection::OnDemand {
  public:
    explicit OnDemand(StoreConnection& connection) : connection_(connection), wasOpen_(connection.isOpen()) {
        connection_.open();
    }
    OnDemand(const OnDemand&) = delete;
    OnDemand& operator=(const OnDemand&) = delete;
    ~OnDemand() {
        if (!wasOpen_) connection_.close();
    }

    [[nodiscard]] sqlite3* database() const {
        if (!connection_.handle_) throw StoreError::makeMissingHandle();
        return connection_.handle_->database.get();
    }

    [[nodiscard]] Statement prepare(const std::string& sql) const {
        sqlite3_stmt* prepared = nullptr;
        const int result = sqlite3_prepare_v2(database(), sql.c_str(), -1, &prepared, nullptr);
        Statement statement(prepared);
        if (result == SQLITE_BUSY) connection_.setPatient(false);
        if (result != SQLITE_OK) throw StoreError::makePrepare(sql, sqlite3_errmsg(database()));
        return statement;
    }

    void run(sqlite3_stmt* statement) const {
        int result = sqlite3_step(statement);
        while (result == SQLITE_ROW) result = sqlite3_step(statement);  // of no interest
        if (result == SQLITE_BUSY) connection_.setPatient(false);
        if (result == SQLITE_DONE) connection_.setPatient(true);
        if (result != SQLITE_DONE) throw StoreError::makeExecute(sqlite3_sql(statement), sqlite3_errmsg(database()));
    }

    /// Runs a statement that is kept for the next time.
    void run(Statement& kept, const char* sql) const {
        if (!kept) kept = prepare(sql);
        try {
            run(kept.get());
            sqlite3_reset(kept.get());
        } catch (...) {
            kept.reset();
            throw;
        }
    }

  private:
    StoreConnection& connection_;
    const bool wasOpen_;
};

StoreConnection::StoreConnection(StoreLocation location, Durability durability)
    : location_(std::move(location)), durability_(durability) {
    open();
}

StoreConnection::~StoreConnection() = default;

const std::string& StoreConnection::path() {
    if (path_.empty()) {
        const auto fileName = "com.veskar.corvane." + DocumentsDirectory::fileNamePart(*location_.name()) + ".db";
        path_ = std::filesystem::absolute(DocumentsDirectory::create() / fileName).string();
    }
    return path_;
}

void StoreConnection::open() {
    if (handle_) return;
    std::string file = ":memory:";
    if (!location_.isMemory()) {
        try {
            file = path();
            createPrivateDirectories(std::filesystem::path(file).parent_path());
            precreatePrivately(file);
        } catch (const std::exception& error) {
            throw StoreError::makeCantOpen(location_, error.what());
        }
    }
    sqlite3* opened = nullptr;
    const int result = sqlite3_open_v2(file.c_str(), &opened, openFlags, nullptr);
    Database database(opened);
    if (result != SQLITE_OK) {
        throw StoreError::makeCantOpen(location_, opened ? sqlite3_errmsg(opened) : sqlite3_errstr(result));
    }
    handle_ = std::make_unique<Handle>(Handle{.database = std::move(database)});
    if (location_.isMemory()) return;
    opened_ = fileIdentity();
    applyPatience();
    const bool isSynced = durability_ == Durability::powerCut;
    for (const char* pragma :
         {"PRAGMA journal_mode=WAL;", isSynced ? "PRAGMA synchronous=FULL;" : "PRAGMA synchronous=NORMAL;"}) {
        if (sqlite3_exec(opened, pragma, nullptr, nullptr, nullptr) == SQLITE_BUSY) setPatient(false);
    }
}

std::optional<StoreConnection::FileIdentity> StoreConnection::fileIdentity() const noexcept {
    struct stat status {};
    if (::stat(path_.c_str(), &status) == 0) return FileIdentity{status.st_dev, status.st_ino};
    // That it cannot be looked at, as after the host gave up privileges, does not mean that it has gone.
    return errno == ENOENT || errno == ENOTDIR ? std::nullopt : opened_;
}

bool StoreConnection::hasLostItsFile() const noexcept {
    return opened_ && fileIdentity() != opened_;
}

void StoreConnection::reopen() {
    close();
    open();
}

void StoreConnection::setBusyTimeout(std::chrono::milliseconds timeout) noexcept {
    busyTimeoutMilliseconds = static_cast<int>(timeout.count());
}

void StoreConnection::setPatient(bool patient) noexcept {
    if (std::exchange(isPatient_, patient) != patient) applyPatience();
}

void StoreConnection::applyPatience() noexcept {
    if (handle_) {
        sqlite3_busy_timeout(handle_->database.get(),
                             isPatient_ ? busyTimeoutMilliseconds.load() : impatientMilliseconds);
    }
}

void StoreConnection::close() noexcept {
    if (!location_.isMemory()) handle_.reset();
}

bool StoreConnection::isOpen() const noexcept {
    return handle_ != nullptr;
}

void StoreConnection::run(const std::string& sql) {
    const OnDemand open(*this);
    open.run(open.prepare(sql).get());
}

void StoreConnection::createTable(const StoreTable& table) {
    run(table.createSQL());
    for (const auto& companion : table.extras().companions) run(companion);
}

void StoreConnection::query(const std::string& sql, FunctionRef<void(StoreStepper&)> readRow) {
    const OnDemand open(*this);
    const Statement statement = open.prepare(sql);
    int result = SQLITE_OK;
    while ((result = sqlite3_step(statement.get())) == SQLITE_ROW) {
        StoreStepper stepper(statement.get());
        readRow(stepper);
    }
    if (result == SQLITE_BUSY) setPatient(false);  // that reading works says nothing about writing
    // An interrupted read is not a short table: whoever cleans up by what it finds must not take it for one.
    if (result != SQLITE_DONE) throw StoreError::makeExecute(sql, sqlite3_errmsg(open.database()));
}

void StoreConnection::transaction(FunctionRef<void()> statements) {
    const OnDemand open(*this);
    open.run(handle_->begin, "BEGIN IMMEDIATE;");
    try {
        statements();
        open.run(handle_->commit, "COMMIT;");
    } catch (...) {
        sqlite3_exec(open.database(), "ROLLBACK;", nullptr, nullptr, nullptr);
        throw;
    }
}

}  // namespace corvane
