// The files in which an agent finds its tasks: any rows or bytes in the journal, any submissions in the spool.

#include <corvane/Agent/Daemon/Intake.h>
#include <corvane/Agent/OutcomeCodec.h>
#include <corvane/Testing/TemporaryDocuments.h>

#include "fuzz/FuzzTarget.h"
#include "tests/support/Files.h"

#include <sqlite3.h>

#include <algorithm>

using namespace corvane;
using namespace corvane::transferd;

namespace {

const std::string marked = "FFFFFFFFFFFFFFFF-0000-0000-000000000";

/// An agent without its transfers: what it makes of its files at a start.
struct Start final : UploadQueue::Source {
    explicit Start(const AgentDirectory& directory) : journal(directory.journalPath(), problem) {
        Intake intake(directory, book, queue);
        intake.load();
        intake.acceptSpooled();
    }
    std::optional<HTTPTransfer> transfer(std::int64_t) override { return std::nullopt; }
    bool mayWait(std::int64_t) override { return false; }
    void troubleChanged(const UploadQueue::Trouble&, const std::vector<std::int64_t>&) override {}
    /// What is told of every task, and how it may end.
    void endAll() {
        static_cast<void>(book.withBodiesGoneBeneath("/"));
        queue.proceed(UploadQueue::Clock::now());
        for (auto& [name, owner] : book.owners()) {
            for (const auto number : std::set(owner.open)) {
                static_cast<void>(book.submission(number).encoded());
                book.complete(number, {std::nullopt, TransferResponse{}});
            }
            for (const auto& [number, client] : std::map(owner.over)) {
                static_cast<void>(decodeOutcome(book.outcome(number)));
                book.describe(number, book.description(number).value_or("text"));
                if (number % 2 == 0) book.forget(number);
            }
            book.setWakeCommand(owner, {"wake"}, 1);
        }
        CORVANE_REQUIRE(book.settle() || journal.isDamaged(), "the journal does not take what has ended");
    }
    std::string problem;
    Journal journal;
    TaskBook book{journal};
    UploadQueue queue{*this, std::chrono::milliseconds(1)};
};

/// Runs statements, as far as the database lets them.
void run(const std::filesystem::path& path, const std::string& sql) {
    sqlite3* database = nullptr;
    sqlite3_open(path.c_str(), &database);
    sqlite3_exec(database, sql.c_str(), nullptr, nullptr, nullptr);
    sqlite3_close(database);
}

/// A journal with a few tasks, and one whose columns have neither types nor rules.
std::array<std::string, 2> makeImages(const AgentDirectory& directory) {
    const auto path = directory.journalPath();
    std::string problem;
    {
        Journal made(path, problem);
        for (int i = 0; i < 3; ++i) made.accept(test::submission(TransferSubmission::newToken(), "s"), 1);
        made.complete(2, encodeOutcome(unreadableOutcome()));
    }
    run(path, "PRAGMA journal_mode=DELETE;");
    std::array<std::string, 2> images{test::readFile(path)};
    run(path,
        "DROP TABLE tasks; DROP TABLE wakes; CREATE TABLE wakes (session, owner, command, used);"
        "CREATE TABLE tasks (number INTEGER PRIMARY KEY, token, accepted, description, submission, outcome, session, "
        "owner);");
    images[1] = test::readFile(path);
    return images;
}

std::string changed(FuzzedDataProvider& in, std::string bytes) {
    for (auto count = in.ConsumeIntegralInRange(0, 6); count > 0; --count) {
        const auto at = in.ConsumeIntegralInRange<std::size_t>(0, bytes.size());
        const auto part = in.ConsumeRandomLengthString(16);
        bytes.replace(at, std::min(part.size(), bytes.size() - at), part);
    }
    return in.ConsumeIntegralInRange(0, 9) == 9 ? bytes.substr(0, in.ConsumeIntegral<std::uint16_t>()) : bytes;
}

void addRows(FuzzedDataProvider& in, const std::filesystem::path& path) {
    const std::string known = "EEEEEEEEEEEEEEEE-0000-0000-000000000";
    const std::string good = test::literal(test::submission(known, "s").encoded()), name = "'" + known + "'";
    const auto row = [&](int columns) {
        std::string values = fuzz::anyLiteral(in, {"1", name});
        while (--columns > 0) values += ", " + fuzz::anyLiteral(in, {"'s'", "1", name, good});
        return " VALUES (" + values + "); ";
    };
    std::string sql;
    for (auto count = in.ConsumeIntegralInRange(1, 4); count > 0; --count) {
        sql += "INSERT OR IGNORE INTO tasks" + row(8) + "INSERT OR IGNORE INTO wakes" + row(4);
    }
    run(path, "BEGIN; " + sql + "COMMIT;");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const test::TemporaryDocuments documents;
    static const AgentDirectory directory(documents / "agent");
    static const auto images = makeImages(directory);
    FuzzedDataProvider in(data, size);
    const auto path = directory.journalPath();
    for (const char* side : {"-wal", "-shm", ".damaged"}) std::filesystem::remove(path.string() + side);
    const bool hasRows = in.ConsumeBool();
    const std::string& image = images[in.ConsumeBool() ? 1 : 0];
    test::writeFile(path, hasRows ? image : changed(in, image));
    if (hasRows) addRows(in, path);
    for (auto count = in.ConsumeIntegralInRange(0, 3); count > 0; --count) {
        const auto token = "000000000000000" + std::to_string(count) + "-0000-0000-000000000";
        test::writeFile(directory.submissionPath(token), changed(in, test::submission(token, "s").encoded()));
    }
    test::writeFile(directory.submissionPath(marked), test::submission(marked, "s").encoded());
    try {
        Start agent(directory);
        const auto left = directory.spooled();  // by a damaged journal that takes nothing
        const bool isLeft = !hasRows && std::count(left.begin(), left.end(), marked) == 1;
        CORVANE_REQUIRE(isLeft || agent.book.find(marked), "a submission was lost");
        agent.endAll();
    } catch (const std::exception& error) {
        CORVANE_REQUIRE(!hasRows && *error.what(), error.what());
    }
    for (const auto& token : directory.spooled()) std::filesystem::remove(directory.submissionPath(token));
    return 0;
}
