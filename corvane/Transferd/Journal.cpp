#include <corvane/Transferd/Journal.h>

#include <corvane/Platform/Error.h>
#include <corvane/Platform/WireReader.h>
#include <corvane/Platform/WireWriter.h>

#include <sqlite3.h>

#include <system_error>

namespace corvane::transferd {

namespace {

// These values are in files: they do not change. A new layout has a new version.
constexpr int applicationID = 0x43565441;
constexpr int version = 1;
constexpr const char* layout =
    "CREATE TABLE tasks ("
    "number INTEGER PRIMARY KEY AUTOINCREMENT, token TEXT NOT NULL UNIQUE, accepted INTEGER NOT NULL, "
    "description TEXT, submission BLOB NOT NULL, outcome BLOB);"
    "CREATE TABLE wakes ("
    "session TEXT NOT NULL, owner TEXT NOT NULL, command BLOB NOT NULL, PRIMARY KEY (session, owner));";

class Damaged : public InvalidArgument {
  public:
    using InvalidArgument::InvalidArgument;
};

[[noreturn]] void fail(sqlite3* database, int code) {
    const std::string text = std::string("the journal cannot be used: ") + sqlite3_errmsg(database);
    if ((code & 0xFF) == SQLITE_CORRUPT || (code & 0xFF) == SQLITE_NOTADB) throw Damaged(text);
    throw InvalidArgument(text);
}

}  // namespace

void Journal::Close::operator()(sqlite3* database) const noexcept {
    sqlite3_close_v2(database);
}

/// A statement with its arguments, for one use.
class Journal::Statement {
  public:
    Statement(Journal& journal, const char* sql) : database_(journal.database_.get()) {
        const int result = sqlite3_prepare_v2(database_, sql, -1, &statement_, nullptr);
        if (result != SQLITE_OK) fail(database_, result);
    }
    Statement(const Statement&) = delete;
    Statement& operator=(const Statement&) = delete;
    ~Statement() { sqlite3_finalize(statement_); }

    Statement& number(std::int64_t value) {
        sqlite3_bind_int64(statement_, ++bound_, value);
        return *this;
    }
    Statement& text(std::string_view value) {
        sqlite3_bind_text(statement_, ++bound_, value.data(), static_cast<int>(value.size()), SQLITE_TRANSIENT);
        return *this;
    }
    Statement& bytes(std::string_view value) {
        sqlite3_bind_blob(statement_, ++bound_, value.data(), static_cast<int>(value.size()), SQLITE_TRANSIENT);
        return *this;
    }

    /// Whether there is a row, or another one.
    bool step() {
        const int result = sqlite3_step(statement_);
        if (result != SQLITE_ROW && result != SQLITE_DONE) fail(database_, result);
        return result == SQLITE_ROW;
    }
    [[nodiscard]] bool isNull(int column) { return sqlite3_column_type(statement_, column) == SQLITE_NULL; }
    [[nodiscard]] std::int64_t integer(int column) { return sqlite3_column_int64(statement_, column); }
    [[nodiscard]] std::string contents(int column) {
        const auto* start = static_cast<const char*>(sqlite3_column_blob(statement_, column));
        return start ? std::string(start, static_cast<std::size_t>(sqlite3_column_bytes(statement_, column)))
                     : std::string();
    }

  private:
    sqlite3* database_;
    sqlite3_stmt* statement_ = nullptr;
    int bound_ = 0;
};

Journal::Journal(const std::filesystem::path& file, std::string& problem) {
    try {
        open(file);
    } catch (const Damaged& damaged) {
        database_.reset();
        auto aside = file;
        aside += ".damaged";
        std::filesystem::rename(file, aside);
        for (const char* side : {"-wal", "-shm"}) {
            auto path = file;
            std::error_code none;
            std::filesystem::remove(path += side, none);
        }
        open(file);
        problem = std::string(damaged.what()) + "; it was moved to " + aside.string();
    }
}

Journal::~Journal() = default;

void Journal::open(const std::filesystem::path& file) {
    sqlite3* opened = nullptr;
    const int result = sqlite3_open_v2(file.c_str(), &opened,
                                       SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE | SQLITE_OPEN_NOFOLLOW, nullptr);
    database_.reset(opened);
    if (result != SQLITE_OK) fail(opened, result);
    sqlite3_extended_result_codes(opened, 1);
    sqlite3_busy_timeout(opened, 2000);  // for somebody who looks into it
    run("PRAGMA cache_size=-256;");
    run("PRAGMA journal_mode=WAL;");
    run("PRAGMA synchronous=NORMAL;");
    Statement stored(*this, "PRAGMA user_version;");
    stored.step();
    if (stored.integer(0) == 0) {
        run("BEGIN IMMEDIATE;");
        run(layout);
        run(("PRAGMA application_id=" + std::to_string(applicationID) + ";").c_str());
        run(("PRAGMA user_version=" + std::to_string(version) + "; COMMIT;").c_str());
    } else if (stored.integer(0) != version) {
        throw InvalidArgument("the journal is of version " + std::to_string(stored.integer(0)));
    }
}

void Journal::run(const char* sql) {
    const int result = sqlite3_exec(database_.get(), sql, nullptr, nullptr, nullptr);
    if (result != SQLITE_OK) fail(database_.get(), result);
}

void Journal::forEach(const std::function<void(Task)>& visit) {
    std::vector<std::int64_t> unreadable;
    Statement all(*this, "SELECT number, accepted, submission, outcome IS NOT NULL FROM tasks ORDER BY number;");
    while (all.step()) {
        try {
            visit({all.integer(0), all.integer(1), TransferSubmission::decode(all.contents(2)), all.integer(3) != 0});
        } catch (const InvalidArgument&) {
            unreadable.push_back(all.integer(0));
        }
    }
    for (const auto number : unreadable) forget(number);
}

std::int64_t Journal::add(const TransferSubmission& submission, std::int64_t accepted) {
    Statement insert(*this, "INSERT INTO tasks (token, accepted, submission, description) VALUES (?, ?, ?, ?);");
    insert.text(submission.token).number(accepted).bytes(submission.encoded());
    if (submission.description) insert.text(*submission.description);
    insert.step();
    return sqlite3_last_insert_rowid(database_.get());
}

void Journal::finish(std::int64_t number, std::string_view outcome) {
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
    if (!find.number(number).step()) throw InvalidArgument("the task is not in the journal");
    return TransferSubmission::decode(find.contents(0));
}

std::optional<std::string> Journal::description(std::int64_t number) {
    Statement find(*this, "SELECT description FROM tasks WHERE number = ?;");
    if (!find.number(number).step() || find.isNull(0)) return std::nullopt;
    return find.contents(0);
}

std::string Journal::outcome(std::int64_t number) {
    Statement find(*this, "SELECT outcome FROM tasks WHERE number = ?;");
    if (!find.number(number).step()) throw InvalidArgument("the task is not in the journal");
    return find.contents(0);
}

void Journal::setWake(const Wake& wake) {
    WireWriter write;
    write(wake.command);
    Statement(*this, "INSERT OR REPLACE INTO wakes (session, owner, command) VALUES (?, ?, ?);")
        .text(wake.session)
        .text(wake.owner)
        .bytes(write.take())
        .step();
}

std::vector<Journal::Wake> Journal::wakes() {
    std::vector<Wake> found;
    Statement all(*this, "SELECT session, owner, command FROM wakes;");
    while (all.step()) {
        Wake wake{all.contents(0), all.contents(1), {}};
        const std::string bytes = all.contents(2);
        WireReader read(bytes);
        read(wake.command);
        found.push_back(std::move(wake));
    }
    return found;
}

}  // namespace corvane::transferd
