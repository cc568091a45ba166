#include <corvane/Agent/Daemon/JournalError.h>
#include <corvane/Agent/Daemon/TaskBook.h>
#include <corvane/Agent/OutcomeCodec.h>
#include <corvane/Agent/WireWriter.h>
#include <corvane/Transfer/TransferError.h>

#include "tests/support/AgentFiles.h"
#include "tests/support/Testing.h"

#include <sqlite3.h>

namespace corvane::test {
namespace {

using namespace transferd;

// The journal's tables as version 1 made them.
constexpr const char* version1 =
    "PRAGMA journal_mode=WAL; PRAGMA application_id=1129731137; PRAGMA user_version=1;"
    "CREATE TABLE tasks (number INTEGER PRIMARY KEY AUTOINCREMENT, token TEXT NOT NULL UNIQUE, "
    "accepted INTEGER NOT NULL, description TEXT, submission BLOB NOT NULL, outcome BLOB);"
    "CREATE TABLE wakes (session TEXT NOT NULL, owner TEXT NOT NULL, command BLOB NOT NULL, "
    "PRIMARY KEY (session, owner));";

// A submission as version 1 wrote it.
std::string submission1(const std::string& token) {
    WireWriter write;
    write(std::string("CVTS"), std::int64_t{1}, token, std::string("s"), std::string("o"), std::optional<std::string>(),
          std::string("http://127.0.0.1/"), std::string("PUT"), std::vector<std::pair<std::string, std::string>>{},
          std::string("/body"));
    for (const std::int64_t number : {65'536, 60'000, 300'000, 4, 86'400'000}) write(number);
    write(std::vector<std::string>{});
    return write.take();
}

/// A journal with its book. Every test has the file `path`, into which it looks by itself.
class JournalTest : public testing::Test {
  protected:
    struct Opened {
        explicit Opened(const std::filesystem::path& path) : journal(path, problem), book(journal) {
            book.load([this](std::int64_t number, const auto&) { open.push_back(number); });
        }
        std::string problem;
        Journal journal;
        TaskBook book;
        std::vector<std::int64_t> open;
    };
    /// Runs statements; the first column of the last row.
    std::string ask(const std::string& sql) const {
        sqlite3* database = nullptr;
        std::string text;
        const auto keep = [](void* into, int, char** values, char**) {
            *static_cast<std::string*>(into) = values[0] ? values[0] : "NULL";
            return 0;
        };
        EXPECT_EQ(sqlite3_open(path.c_str(), &database), SQLITE_OK);
        EXPECT_EQ(sqlite3_exec(database, sql.c_str(), keep, &text, nullptr), SQLITE_OK) << sqlite3_errmsg(database);
        sqlite3_close(database);
        return text;
    }
    static TransferSubmission submission() { return test::submission(TransferSubmission::newToken(), "o"); }
    static int code(TaskBook& book, std::int64_t number) {
        const auto outcome = decodeOutcome(book.outcome(number));
        return outcome.error ? outcome.error->as<TransferError>()->code() : int(outcome.response->statusCode);
    }

    TemporaryDocuments documents;
    const std::filesystem::path path = documents / "journal.db";
    const int network = static_cast<int>(TransferError::Code::network);
};

TEST_F(JournalTest, TakesOverWhatAnEarlierVersionHasLeft) {
    const auto token = [](int i) { return std::string(35, '0') + std::to_string(i); };
    const auto insert = [&](int i, const std::string& submission, const std::string& outcome) {
        ask("INSERT INTO tasks (token, accepted, submission, outcome) VALUES ('" + token(i) + "', 1, " +
            literal(submission) + ", " + outcome + ")");
    };
    ask(version1);
    insert(1, submission1(token(1)), "NULL");
    insert(2, submission1(token(2)), literal(encodeOutcome({std::nullopt, TransferResponse{true, 204, {}}})));
    insert(3, submission1(token(3)), "'x'");
    insert(4, "x", "NULL");  // nobody knows whose
    ask("INSERT INTO wakes VALUES ('s', 'o', 'x')");
    {
        Opened now(path);
        EXPECT_EQ(now.open, std::vector<std::int64_t>{1});
        EXPECT_EQ(code(now.book, 2), 204);
        EXPECT_EQ(code(now.book, 3), network);
        EXPECT_EQ(now.book.owners().size(), 1u);
        EXPECT_EQ(ask("PRAGMA user_version") + ask("SELECT count(*) FROM tasks"), "23");
        // A record of this version says whose it is even when the rest of it cannot be read.
        const auto number = now.book.accept(submission(), 0);
        ask("UPDATE tasks SET submission = 'x' WHERE number = " + std::to_string(number));
    }
    Opened again(path);
    EXPECT_EQ(code(again.book, 5), network);
    EXPECT_EQ(again.book.owner("s", "o").over.size(), 3u);
}

TEST_F(JournalTest, OneThatIsDamagedIsMovedAsideAndALaterVersionsIsLeftAlone) {
    {
        Opened before(path);
        for (int i = 0; i < 200; ++i) before.book.accept(submission(), 0);
    }
    auto contents = readFile(path);
    ASSERT_GT(contents.size(), 10u * 4096);
    std::fill(contents.begin() + 4 * 4096, contents.end(), 'x');  // in pages that a start would not need
    writeFile(path, contents);
    {
        Opened after(path);
        EXPECT_NE(after.problem.find("it was moved to " + path.string() + ".damaged"), std::string::npos);
        EXPECT_TRUE(after.open.empty());
        EXPECT_EQ(after.book.accept(submission(), 0), 1);
    }
    EXPECT_EQ(readFile(path.string() + ".damaged"), contents);
    ask("PRAGMA user_version = 99");
    std::string refusal;
    try {
        const Opened later(path);
    } catch (const JournalError& error) {
        refusal = error.what();
    }
    EXPECT_EQ(refusal, "the journal is of version 99");
    EXPECT_EQ(ask("PRAGMA user_version") + ask("SELECT count(*) FROM tasks"), "991");
}

TEST_F(JournalTest, WritesWhatItDidNotTakeWhenTheDiskHasRoomAgain) {
    Opened now(path);
    const auto ended = now.book.accept(submission(), 0), told = now.book.accept(submission(), 0);
    for (const std::string change : {"INSERT", "UPDATE", "DELETE"}) {
        ask("CREATE TRIGGER full" + change + " BEFORE " + change + " ON tasks BEGIN SELECT RAISE(FAIL, 'full'); END");
    }
    EXPECT_THROW(now.book.accept(submission(), 0), JournalError);
    now.book.complete(ended, {std::nullopt, TransferResponse{true, 200, {}}});
    now.book.complete(told, {std::nullopt, TransferResponse{true, 200, {}}});
    now.book.forget(told);
    EXPECT_EQ(code(now.book, ended), 200) << "hosts are told all the same";
    EXPECT_FALSE(now.book.settle() || now.book.isSettled());
    for (const std::string change : {"INSERT", "UPDATE", "DELETE"}) ask("DROP TRIGGER full" + change);
    EXPECT_TRUE(now.book.settle() && now.book.isSettled());
    EXPECT_EQ(ask("SELECT count(*) FROM tasks") + ask("SELECT outcome IS NULL FROM tasks"), "10");
}

}  // namespace
}  // namespace corvane::test
