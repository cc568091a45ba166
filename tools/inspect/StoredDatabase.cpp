#include "StoredDatabase.h"

#include <sqlite3.h>
#include <stdlib.h>

#include <optional>
#include <system_error>
#include <utility>

namespace inspect {

namespace {

namespace fs = std::filesystem;

constexpr int patience = 1000;  // milliseconds; a host's own write takes less than one

fs::path beside(const fs::path& file, const char* suffix) {
    return file.native() + suffix;
}

struct Finalize {
    void operator()(sqlite3_stmt* statement) const noexcept { sqlite3_finalize(statement); }
};

// What tells whether a file has changed meanwhile.
std::optional<std::pair<fs::file_time_type, std::uintmax_t>> stamp(const fs::path& file) {
    std::error_code error;
    const auto time = fs::last_write_time(file, error);
    if (error) return std::nullopt;
    const auto size = fs::file_size(file, error);
    if (error) return std::nullopt;
    return std::pair(time, size);
}

}  // namespace

void StoredDatabase::Close::operator()(sqlite3* database) const noexcept {
    sqlite3_close_v2(database);
}

StoredDatabase::StoredDatabase(const fs::path& file) : file_(file) {
    std::error_code error;
    if (!fs::is_regular_file(file, error)) throw Problem(file.string() + " is no file that can be read");
    fs::path opened = file;
    if (!fs::exists(beside(file, "-shm"), error)) {
        std::string name = (fs::temp_directory_path() / "corvane-inspect-XXXXXX").string();
        if (!::mkdtemp(name.data())) throw Problem("no temporary directory can be made in " + name);
        copy_ = name;
        try {
            copyTo(copy_);
        } catch (...) {
            fs::remove_all(copy_, error);
            throw;
        }
        opened = copy_ / "copy.db";
    }
    sqlite3* database = nullptr;
    const int result = sqlite3_open_v2(opened.c_str(), &database, SQLITE_OPEN_READONLY | SQLITE_OPEN_NOFOLLOW, nullptr);
    database_.reset(database);
    if (result != SQLITE_OK) throw Problem(file.string() + ": " + sqlite3_errstr(result));
    sqlite3_busy_timeout(database, patience);
}

StoredDatabase::~StoredDatabase() {
    database_.reset();
    std::error_code error;
    if (!copy_.empty()) fs::remove_all(copy_, error);
}

// Nobody has it open. Should somebody open it just now, the two files may not belong together: then once more.
void StoredDatabase::copyTo(const fs::path& directory) {
    constexpr int attempts = 5;
    const fs::path log = beside(file_, "-wal"), target = directory / "copy.db";
    for (int i = 0; i < attempts; ++i) {
        const auto before = std::pair(stamp(file_), stamp(log));
        std::error_code error, none;
        fs::copy_file(file_, target, fs::copy_options::overwrite_existing, error);
        if (error) throw Problem(file_.string() + " cannot be copied: " + error.message());
        fs::remove(beside(target, "-wal"), none);
        if (before.second) fs::copy_file(log, beside(target, "-wal"), error);
        if (!error && before == std::pair(stamp(file_), stamp(log))) return;
    }
    throw Problem(file_.string() + " changes too fast to be copied");
}

std::size_t StoredDatabase::forEach(const std::string& query, const Row& visit) {
    sqlite3_stmt* prepared = nullptr;
    const int result = sqlite3_prepare_v2(database_.get(), query.c_str(), -1, &prepared, nullptr);
    const std::unique_ptr<sqlite3_stmt, Finalize> statement(prepared);
    if (result != SQLITE_OK) throw Problem(file_.string() + ": " + sqlite3_errmsg(database_.get()));
    std::size_t unreadable = 0;
    for (;;) {
        const int step = sqlite3_step(prepared);
        if (step == SQLITE_DONE) return unreadable;
        if (step != SQLITE_ROW) throw Problem(file_.string() + ": " + sqlite3_errmsg(database_.get()));
        corvane::StoreStepper row(prepared);
        try {
            visit(row);
        } catch (const std::exception&) {
            ++unreadable;
        }
    }
}

bool StoredDatabase::hasTable(const std::string& name) {
    bool isThere = false;
    forEach("SELECT name FROM sqlite_master WHERE type = 'table'",
            [&](corvane::StoreStepper& row) { isThere |= row.text() == name; });
    return isThere;
}

}  // namespace inspect
