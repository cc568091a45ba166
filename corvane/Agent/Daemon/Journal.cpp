#include <corvane/Agent/Daemon/Journal.h>

#include <corvane/Agent/Daemon/JournalError.h>
#include <corvane/Agent/FormatError.h>
#include <corvane/Agent/WireReader.h>
#include <corvane/Agent/WireWriter.h>

#include <sqlite3.h>

#include <limits>
#include <system_error>

namespace corvane::transferd {

namespace {

// These values are in files: they do not change. A new layout has a new version.
constexpr int applicationID = 0x43565441;
constexpr int version = 2;
constexpr const char* layout =
    "CREATE TABLE tasks ("
    "number INTEGER PRIMARY KEY AUTOINCREMENT, token TEXT NOT NULL UNIQUE, accepted INTEGER NOT NULL, "
    "description TEXT, submission BLOB NOT NULL, outcome BLOB, "
    "session TEXT NOT NULL DEFAULT '', owner TEXT NOT NULL DEFAULT '');"
    "CREATE TABLE wakes ("
    "session TEXT NOT NULL, owner TEXT NOT NULL, command BLOB NOT NULL, used INTEGER NOT NULL DEFAULT 0, "
    "PRIMARY KEY (session, owner));";
// Version 1 had no date, so what it has left counts as heard of at the take-over; its tasks' owners are in their
// submissions only.
constexpr const char* fromVersion1 =
    "ALTER TABLE tasks ADD COLUMN session TEXT NOT NULL DEFAULT '';"
    "ALTER TABLE tasks ADD COLUMN owner TEXT NOT NULL DEFAULT '';"
    "ALTER TABLE wakes ADD COLUMN used INTEGER NOT NULL DEFAULT 0;"
    "UPDATE wakes SET used = CAST(strftime('%s', 'now') AS INTEGER) * 1000;";
constexpr std::int64_t wakesAreKept = std::int64_t{1000} * 60 * 60 * 24 * 30;

// What a database keeps beside its file belongs to the damaged one, and goes.
std::filesystem::path moveAside(const std::filesystem::path& path) {
    auto aside = path;
    aside += ".damaged";
    std::filesystem::rename(path, aside);
    for (const char* ending : {"-wal", "-shm"}) {
        auto side = path;
        std::error_code none;
        std::filesystem::remove(side += ending, none);
    }
    return aside;
}

}  // namespace

void Journal::Close::operator()(sqlite3* database) const noexcept {
    sqlite3_close_v2(database);
}
void Journal::Finalize::operator()(sqlite3_stmt* statement) const noexcept {
    sqlite3_finalize(statement);
}

void Journal::fail(int code) {
    isDamaged_ = isDamaged_ || (code & 0xFF) == SQLITE_CORRUPT || (code & 0xFF) == SQLITE_NOTADB;
    throw JournalError(std::string("the journal cannot be used: ") + sqlite3_errmsg(database_.get()));
}

/// A statement with its arguments, for one use. What was prepared is kept for the next of the same text, a literal:
/// every document takes the same few.
class Journal::Statement {
  public:
    Statement(Journal& journal, const char* sql) : journal_(journal), kept_(journal.prepared_[sql]) {
        prepared_ = std::move(kept_);
        if (prepared_) return;
        sqlite3_stmt* prepared = nullptr;
        const int result = sqlite3_prepare_v2(journal.database_.get(), sql, -1, &prepared, nullptr);
        prepared_.reset(prepared);
        if (result != SQLITE_OK) journal.fail(result);
    }
    Statement(const Statement&) = delete;
    Statement& operator=(const Statement&) = delete;
    ~Statement() {
        sqlite3_reset(prepared_.get());
        sqlite3_clear_bindings(prepared_.get());
        kept_ = std::move(prepared_);
    }

    Statement& number(std::int64_t value) {
        sqlite3_bind_int64(prepared_.get(), ++bound_, value);
        return *this;
    }
    Statement& text(std::string_view value) {
        sqlite3_bind_text(prepared_.get(), ++bound_, value.data(), static_cast<int>(value.size()), SQLITE_TRANSIENT);
        return *this;
    }
    Statement& bytes(std::string_view value) {
        sqlite3_bind_blob(prepared_.get(), ++bound_, value.data(), static_cast<int>(value.size()), SQLITE_TRANSIENT);
        return *this;
    }

    /// Whether there is a row, or another one.
    bool step() {
        const int result = sqlite3_step(prepared_.get());
        if (result != SQLITE_ROW && result != SQLITE_DONE) journal_.fail(result);
        return result == SQLITE_ROW;
    }
    [[nodiscard]] bool isNull(int column) { return sqlite3_column_type(prepared_.get(), column) == SQLITE_NULL; }
    [[nodiscard]] std::int64_t integer(int column) { return sqlite3_column_int64(prepared_.get(), column); }
    [[nodiscard]] std::string contents(int column) {
        const auto* start = static_cast<const char*>(sqlite3_column_blob(prepared_.get(), column));
        return start ? std::string(start, static_cast<std::size_t>(sqlite3_column_bytes(prepared_.get(), column)))
                     : std::string();
    }

  private:
    Journal& journal_;
    Prepared& kept_;
    Prepared prepared_;
    int bound_ = 0;
};

Journal::Journal(const std::filesystem::path& path, std::string& problem) {
    try {
        open(path);
    } catch (const JournalError& damaged) {
        if (!isDamaged_) throw;
        isDamaged_ = false;
        prepared_.clear();
        database_.reset();
        const auto aside = moveAside(path);
        open(path);
        problem = std::string(damaged.what()) + "; it was moved to " + aside.string();
    }
}

Journal::~Journal() = default;

void Journal::open(const std::filesystem::path& path) {
    sqlite3* opened = nullptr;
    const int result = sqlite3_open_v2(path.c_str(), &opened,
                                       SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE | SQLITE_OPEN_NOFOLLOW, nullptr);
    database_.reset(opened);
    if (result != SQLITE_OK) fail(result);
    sqlite3_extended_result_codes(opened, 1);
    sqlite3_busy_timeout(opened, 2000);  // for somebody who looks into it
    run("PRAGMA cache_size=-256;");
    run("PRAGMA journal_mode=WAL;");
    run("PRAGMA synchronous=NORMAL;");
    // What SQLite cannot open for writing, for want of a descriptor or of room, it takes as read-only, the side files
    // too. An agent that kept it so could neither take a task nor let go of one, and would never end.
    const int writable = sqlite3_exec(opened, "BEGIN IMMEDIATE; ROLLBACK;", nullptr, nullptr, nullptr);
    if ((writable & 0xff) == SQLITE_READONLY) fail(writable);
    if (sqlite3_db_readonly(opened, "main") == 1) throw JournalError("the journal cannot be opened for writing");
    std::int64_t found = 0;
    {
        Statement stored(*this, "PRAGMA user_version;");
        stored.step();
        found = stored.integer(0);
    }
    if (found < 0 || found > version) throw JournalError("the journal is of version " + std::to_string(found));
    check();
    if (found != version) takeOver(found);
    checkNumbers();
}

void Journal::takeOver(std::int64_t found) {
    run("BEGIN IMMEDIATE;");
    run(found == 0 ? layout : fromVersion1);
    run(("PRAGMA application_id=" + std::to_string(applicationID) + ";").c_str());
    run(("PRAGMA user_version=" + std::to_string(version) + "; COMMIT;").c_str());
}

// Every page is looked at, not only those that a start happens to need: a journal that cannot be written to would send
// every host back to itself for good.
void Journal::check() {
    Statement checked(*this, "PRAGMA quick_check(1);");
    if (checked.step() && checked.contents(0) != "ok") {
        isDamaged_ = true;
        throw JournalError("the journal cannot be used: " + checked.contents(0));
    }
}

// A single damaged row takes all numbers behind its own: no task would ever be accepted.
void Journal::checkNumbers() {
    Statement last(*this,
                   "SELECT max(coalesce(max(number), 0), "
                   "coalesce((SELECT max(seq) FROM sqlite_sequence WHERE name = 'tasks'), 0)) FROM tasks;");
    if (!last.step() || last.integer(0) < std::numeric_limits<std::int64_t>::max() / 2) return;
    isDamaged_ = true;
    throw JournalError("the journal cannot be used: there are no numbers left for tasks");
}

void Journal::run(const char* sql) {
    const int result = sqlite3_exec(database_.get(), sql, nullptr, nullptr, nullptr);
    if (result != SQLITE_OK) fail(result);
}

void Journal::forEach(const std::function<void(Task)>& visit) {
    Statement all(*this,
                  "SELECT number, accepted, submission, outcome IS NOT NULL, token, session, owner FROM tasks "
                  "ORDER BY number;");
    while (all.step()) {
        Task task{all.integer(0), all.integer(1), {}, true, all.integer(3) != 0};
        try {
            task.submission = TransferSubmission::decode(all.contents(2));
        } catch (const FormatError&) {
            task.isReadable = false;
            task.submission.token = all.contents(4);
            task.submission.session = all.contents(5);
            task.submission.owner = all.contents(6);
        }
        visit(std::move(task));
    }
}

std::int64_t Journal::accept(const TransferSubmission& submission, std::int64_t accepted) {
    Statement insert(*this,
                     "INSERT INTO tasks (token, accepted, submission, session, owner, description) "
                     "VALUES (?, ?, ?, ?, ?, ?);");
    insert.text(submission.token).number(accepted).bytes(submission.encoded());
    insert.text(submission.session).text(submission.owner);
    if (submission.description) insert.text(*submission.description);
    insert.step();
    return sqlite3_last_insert_rowid(database_.get());
}

void Journal::together(const std::function<void()>& changes) {
    Statement(*this, "BEGIN IMMEDIATE;").step();
    try {
        changes();
        Statement(*this, "COMMIT;").step();
    } catch (...) {
        sqlite3_exec(database_.get(), "ROLLBACK;", nullptr, nullptr, nullptr);
        throw;
    }
}

void Journal::complete(std::int64_t number, std::string_view outcome) {
    Statement(*this, "UPDATE tasks SET outcome = ? WHERE number = ?;").bytes(outcome).number(number).step();
}

void Journal::forget(std::int64_t number) {
    Statement(*this, "DELETE FROM tasks WHERE number = ?;").number(number).step();
}

void Journal::describe(std::int64_t number, const std::string& description) {
    Statement(*this, "UPDATE tasks SET description = ? WHERE number = ?;").text(description).number(number).step();
}

TransferSubmission Journal::submission(std::int64_t number) {
    Statement find(*this, "SELECT submission FROM tasks WHERE number = ?;");
    if (!find.number(number).step()) throw JournalError("the task is not in the journal");
    return TransferSubmission::decode(find.contents(0));
}

std::optional<std::string> Journal::description(std::int64_t number) {
    Statement find(*this, "SELECT description FROM tasks WHERE number = ?;");
    if (!find.number(number).step() || find.isNull(0)) return std::nullopt;
    return find.contents(0);
}

std::string Journal::outcome(std::int64_t number) {
    Statement find(*this, "SELECT outcome FROM tasks WHERE number = ?;");
    if (!find.number(number).step()) throw JournalError("the task is not in the journal");
    return find.contents(0);
}

void Journal::setWake(const std::string& session, const std::string& owner, const std::vector<std::string>& command,
                      std::int64_t now) {
    WireWriter write;
    write(command);
    Statement(*this, "INSERT OR REPLACE INTO wakes (session, owner, command, used) VALUES (?, ?, ?, ?);")
        .text(session)
        .text(owner)
        .bytes(write.take())
        .number(now)
        .step();
    Statement(*this,
              "DELETE FROM wakes WHERE used < ? OR "
              "rowid NOT IN (SELECT rowid FROM wakes ORDER BY used DESC LIMIT ?);")
        .number(now - wakesAreKept)
        .number(mostWakes)
        .step();
}

std::vector<std::string> Journal::wake(const std::string& session, const std::string& owner) {
    Statement find(*this, "SELECT command FROM wakes WHERE session = ? AND owner = ?;");
    if (!find.text(session).text(owner).step()) return {};
    const std::string bytes = find.contents(0);
    std::vector<std::string> command;
    try {
        WireReader read(bytes);
        read(command);
    } catch (const FormatError&) {  // the host says it again
        command.clear();
    }
    return command;
}

}  // namespace corvane::transferd
