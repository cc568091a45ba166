#include <corvane/Platform/DocumentsDirectory.h>

#include "tests/Store/Note.h"
#include "tests/support/Testing.h"

namespace corvane::test {
namespace {

template <class Function>
StoreError thrownBy(Function&& function) {
    try {
        function();
    } catch (const StoreError& error) {
        return error;
    }
    ADD_FAILURE() << "nothing was thrown";
    return StoreError::makeMissingHandle();
}

const Note apple{.identifier = "a", .count = 1, .weight = 0.5, .body = std::string("\0x", 2), .remark = "it's ripe"};
const Note pear{.identifier = "p", .count = -2};

TEST(Store, KeepsOneRowPerKeyAndFindsRowsByColumnAlsoInMemoryWhenItIsClosed) {
    Store<Note> store(StoreLocation::memory());
    store.createTable();
    EXPECT_TRUE(store.fetchAll().empty());
    auto riper = apple;
    riper.remark.reset();
    for (const auto& note : {apple, pear, riper}) store.insert(note);
    store.close();
    EXPECT_EQ(store.fetchAll().size(), 2U);
    EXPECT_EQ(store.fetchWhere("identifier", "a"), std::vector{riper});
    EXPECT_EQ(store.fetchWhere("count", -2), std::vector{pear});
    store.deleteWhere("identifier", "p' OR '1' = '1");
    store.deleteWhere("identifier", "a");
    EXPECT_EQ(store.fetchAll(), std::vector{pear});
}

TEST(Store, FilesArePrivateNamedAfterTheLocationAndOpenForAsLongAsTheyAreUsed) {
    const TemporaryDocuments documents;
    DocumentsDirectory::set(documents / "made on demand 100%");
    Store<Note> store(StoreLocation::default_(" Main Store\n"));
    EXPECT_TRUE(store.isOpen());
    store.createTable();
    store.close();
    store.insert(apple);
    EXPECT_THROW(static_cast<void>(store.fetchWhere("no such column", 1)), StoreError);
    EXPECT_FALSE(store.isOpen()) << "but for one statement";
    store.open();
    EXPECT_TRUE(store.isOpen());
    const auto directory = documents / "made on demand 100%";
    const auto file = directory / "com.veskar.corvane.main store.db";
    EXPECT_EQ(permissions(directory), 0700U);
    EXPECT_EQ(permissions(file), 0600U);
    EXPECT_EQ(permissions(file.string() + "-wal"), 0600U);
    EXPECT_EQ(permissions(file.string() + "-shm"), 0600U);
    EXPECT_EQ(Store<Note>(StoreLocation::default_("MAIN STORE")).fetchAll(), std::vector{apple});
}

TEST(Store, SaysWhereItCannotOpen) {
    const TemporaryDocuments documents;
    std::filesystem::create_directories(documents / "com.veskar.corvane.taken.db");
    std::filesystem::create_symlink(documents / "nowhere", documents / "com.veskar.corvane.dangling.db");
    for (const char* name : {"taken", "../outside", "", "dangling"}) {
        const auto location = StoreLocation::default_(name);
        const auto error = thrownBy([&] { const Store<Note> store(location); });
        EXPECT_EQ(error.value(), StoreError::cantOpen);
        EXPECT_EQ(error.location(), location);
    }
    EXPECT_FALSE(std::filesystem::exists(documents / "nowhere"));
    writeFile(documents / "file", "");
    DocumentsDirectory::set(documents / "file");
    EXPECT_EQ(thrownBy([] { const Store<Note> store(StoreLocation::default_("main")); }).value(), StoreError::cantOpen);
}

TEST(Store, FailedStatementsCarryTheirTextAndKeepDataOutOfTheMessage) {
    Store<Note> store(StoreLocation::memory());
    const auto unprepared = thrownBy([&] { store.insert(apple); });
    EXPECT_EQ(unprepared.value(), StoreError::prepare);
    EXPECT_NE(unprepared.sql().find("it''s ripe"), std::string::npos);
    EXPECT_EQ(std::string(unprepared.what()).find("ripe"), std::string::npos);

    StoreConnection connection(StoreLocation::memory());
    connection.run("CREATE TABLE t (x TEXT NOT NULL);");
    const auto unexecuted = thrownBy([&] { connection.run("INSERT INTO t VALUES (NULL);"); });
    EXPECT_EQ(unexecuted.value(), StoreError::execute);
    EXPECT_EQ(unexecuted.sql(), "INSERT INTO t VALUES (NULL);");
    const auto overflow = "SELECT 1 UNION ALL SELECT abs(-9223372036854775807 - 1);";
    const auto interrupted = thrownBy([&] { connection.query(overflow, [](StoreStepper&) {}); });
    EXPECT_EQ(interrupted.value(), StoreError::execute) << "what was read by then is not all there is";
}

}  // namespace
}  // namespace corvane::test
