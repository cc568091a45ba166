#include <corvane/Agent/OutcomeCodec.h>
#include <corvane/Agent/TransferSubmission.h>
#include <corvane/Agent/WireWriter.h>

#include "tests/Agent/AgentFixture.h"

#include <signal.h>
#include <sqlite3.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <algorithm>

namespace corvane::test {
namespace {

using Reply = ScriptedServer::Reply;
using Outcomes = std::map<std::string, std::string>;

// The journal's tables as version 1 made them.
constexpr const char* version1 =
    "PRAGMA journal_mode=WAL; PRAGMA application_id=1129731137; PRAGMA user_version=1;"
    "CREATE TABLE tasks (number INTEGER PRIMARY KEY AUTOINCREMENT, token TEXT NOT NULL UNIQUE, "
    "accepted INTEGER NOT NULL, description TEXT, submission BLOB NOT NULL, outcome BLOB);"
    "CREATE TABLE wakes (session TEXT NOT NULL, owner TEXT NOT NULL, command BLOB NOT NULL, "
    "PRIMARY KEY (session, owner));";

class Database {
  public:
    explicit Database(const std::filesystem::path& file) {
        EXPECT_EQ(sqlite3_open(file.c_str(), &database_), SQLITE_OK);
        sqlite3_busy_timeout(database_, 5000);
    }
    Database(const Database&) = delete;
    Database& operator=(const Database&) = delete;
    ~Database() { sqlite3_close(database_); }

    void run(const std::string& sql, const std::vector<std::string>& blobs = {}) {
        sqlite3_stmt* statement = nullptr;
        for (const char* rest = sql.c_str(); *rest;) {
            ASSERT_EQ(sqlite3_prepare_v2(database_, rest, -1, &statement, &rest), SQLITE_OK)
                << sqlite3_errmsg(database_);
            int bound = 0;
            for (const auto& blob : blobs) {
                sqlite3_bind_blob(statement, ++bound, blob.data(), static_cast<int>(blob.size()), SQLITE_TRANSIENT);
            }
            while (sqlite3_step(statement) == SQLITE_ROW) text_ = text(statement);
            sqlite3_finalize(statement);
        }
    }
    std::string ask(const std::string& sql) {
        text_.clear();
        run(sql);
        return text_;
    }

  private:
    static std::string text(sqlite3_stmt* statement) {
        const auto* found = sqlite3_column_text(statement, 0);
        return found ? reinterpret_cast<const char*>(found) : "NULL";
    }

    sqlite3* database_ = nullptr;
    std::string text_;
};

class JournalTest : public AgentFixture {
  protected:
    [[nodiscard]] std::filesystem::path journal() const { return options.directory / "journal.db"; }

    /// A submission as version 1 wrote it.
    std::string submission(const std::string& token, const std::string& description) {
        WireWriter write;
        write(std::string("CVTS"), std::int64_t{1}, token, std::string("session"), std::string("owner"),
              std::optional(description), server.url(), std::string("PUT"),
              std::vector<std::pair<std::string, std::string>>{}, body("body " + description, description).string());
        for (const std::int64_t number : {65'536, 60'000, 300'000, 4, 86'400'000}) write(number);
        write(std::vector<std::string>{});
        return write.take();
    }
    void limitFiles(rlim_t size) const {
        const rlimit limit{size, RLIM_INFINITY};
        EXPECT_EQ(prlimit(static_cast<pid_t>(agent()), RLIMIT_FSIZE, &limit, nullptr), 0);
    }
    [[nodiscard]] bool hasOpen(const std::filesystem::path& file) const {
        std::error_code none;
        const std::filesystem::directory_iterator descriptors("/proc/" + std::to_string(agent()) + "/fd", none), end;
        return std::any_of(descriptors, end, [&](const auto& one) {
            std::error_code gone;
            return std::filesystem::read_symlink(one, gone) == file;
        });
    }
    /// The agent's program behind one that counts how often it is started.
    void countStarts() {
        const auto counting = body("counting", "#!/bin/sh\necho >> '" + starts().string() + "'\nexec '" +
                                                   options.program.string() + "' \"$@\"\n");
        chmod(counting.c_str(), 0700);
        options.program = counting;
    }
    [[nodiscard]] std::filesystem::path starts() const { return documents / "starts"; }
};

TEST_F(JournalTest, TakesOverWhatAnEarlierVersionHasLeft) {
    std::filesystem::create_directories(options.directory / "spool");
    const std::string tokens[] = {TransferSubmission::newToken(), TransferSubmission::newToken(),
                                  TransferSubmission::newToken(), TransferSubmission::newToken()};
    {
        Database old(journal());
        old.run(version1);
        const std::string add = "INSERT INTO tasks (token, accepted, description, submission, outcome) VALUES ('";
        const std::string accepted = "', strftime('%s', 'now') * 1000, '";
        old.run(add + tokens[0] + accepted + "open', ?, NULL)", {submission(tokens[0], "open")});
        old.run(add + tokens[1] + accepted + "over', ?, ?)",
                {submission(tokens[1], "over"),
                 encodeOutcome({std::nullopt, TransferResponse{true, 204, {}}})});
        old.run(add + tokens[2] + accepted + "broken outcome', ?, 'x')", {submission(tokens[2], "broken outcome")});
        old.run(add + tokens[3] + accepted + "broken submission', 'x', NULL)");
        old.run("INSERT INTO wakes VALUES ('session', 'owner', 'x')");
    }
    const auto spooled = TransferSubmission::newToken();
    writeFile(options.directory / "spool" / spooled, submission(spooled, "spooled"));

    const auto abandoned = options.directory / "spool" / ("." + spooled + ".x.partial");
    writeFile(abandoned, "half");
    std::filesystem::last_write_time(abandoned, std::filesystem::file_time_type::clock::now() - std::chrono::hours(2));

    auto session = open(recorder);
    ASSERT_TRUE(recorder->wait(4));
    EXPECT_FALSE(std::filesystem::exists(abandoned));
    EXPECT_EQ(recorder->outcomes(),
              (Outcomes{{"open", "200"}, {"over", "204"}, {"broken outcome", "network"}, {"spooled", "200"}}));
    EXPECT_TRUE(running(*session).empty());
    EXPECT_EQ(log.count("agent"), 0);
    EXPECT_EQ(Database(journal()).ask("PRAGMA user_version"), "2");

    // A record of this version says whose it is even when the rest of it cannot be read.
    server.script(Reply::never());
    upload(*session, server.url(), "cut off");
    ASSERT_TRUE(server.waitForRequests(3));
    session.reset();
    end(options.directory);
    Database(journal()).run("UPDATE tasks SET submission = 'x'");
    session = open(recorder);
    ASSERT_TRUE(recorder->wait(5));
    EXPECT_EQ(recorder->outcomes()["cut off"], "network");
}

TEST_F(JournalTest, OneThatCannotBeUsedIsMovedAsideOrLeftAloneAndTheHostIsTold) {
    server.script(Reply::never(), 4);
    auto session = open(recorder);
    for (int i = 0; i < 200; ++i) upload(*session, server.url(), std::to_string(i));
    EXPECT_EQ(running(*session).size(), 200u);
    session.reset();
    end(options.directory);
    {  // damage behind the first page, in pages that a start would not need
        Database(journal()).run("PRAGMA wal_checkpoint(TRUNCATE)");
        auto contents = readFile(journal());
        ASSERT_GT(contents.size(), 10u * 4096);
        std::fill(contents.begin() + 4 * 4096, contents.end(), 'x');
        writeFile(journal(), contents);
    }
    recorder = std::make_shared<SessionRecorder>();
    session = open(recorder);
    upload(*session, server.url(), "after damage");
    ASSERT_TRUE(recorder->wait(1));
    EXPECT_EQ(log.count("Transfer agent reports a problem"), 1);
    EXPECT_TRUE(std::filesystem::exists(options.directory / "journal.db.damaged"));
    session.reset();
    end(options.directory);

    Database(journal()).run("PRAGMA user_version = 99");
    options.deadline = 500ms;
    countStarts();
    recorder = std::make_shared<SessionRecorder>();
    session = open(recorder);
    upload(*session, server.url(), "beside a later version");
    ASSERT_TRUE(recorder->wait(1));
    EXPECT_EQ(recorder->outcomes(), (Outcomes{{"beside a later version", "200"}}));
    EXPECT_TRUE(log.waitFor("inside the process, error=the journal is of version 99"));
    EXPECT_LE(readFile(starts()).size(), 8u);
    EXPECT_EQ(Database(journal()).ask("PRAGMA user_version"), "99");
}

TEST_F(JournalTest, WritesHowATaskEndedWhenTheDiskHasRoomAgain) {
    server.script(Reply::status(200).hold());
    auto session = open(recorder);
    upload(*session, server.url(), "a");
    ASSERT_TRUE(server.waitForRequests(1));
    session.reset();
    limitFiles(1);
    server.release();
    ASSERT_TRUE(eventually([&] { return !hasOpen(documents / "body a"); }));
    auto second = open(std::make_shared<SessionRecorder>(), "another");  // the agent answers it behind the end
    EXPECT_TRUE(running(*second).empty());
    EXPECT_EQ(Database(journal()).ask("SELECT outcome FROM tasks"), "NULL");
    limitFiles(RLIM_INFINITY);
    EXPECT_TRUE(eventually([&] { return Database(journal()).ask("SELECT outcome FROM tasks") != "NULL"; }, 20s));
    second.reset();
    end(options.directory);
    session = open(recorder);
    ASSERT_TRUE(recorder->wait(1));
    EXPECT_EQ(recorder->outcomes(), (Outcomes{{"a", "200"}}));
    EXPECT_EQ(server.requests().size(), 1u) << "it is not sent twice";
}

}  // namespace
}  // namespace corvane::test
