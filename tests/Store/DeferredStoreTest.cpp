#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Store/VersionEntity.h>

#include "tests/Store/Note.h"
#include "tests/support/Testing.h"

namespace corvane::test {
namespace {

constexpr const char* dropMessage =
    "Store version on disk is different than source, must drop the table since migrations are not supported, "
    "table=notes, diskVersion=";

std::vector<Note> allNotes(DeferredStore<Note>& store) {
    return store.perform([](Store<Note>& notes) { return notes.fetchAll(); });
}

void addNote(DeferredStore<Note>& store) {
    store.perform([](Store<Note>& notes) {
        notes.createTable();
        notes.insert({.identifier = "a"});
    });
}

/// Waits until connections of stores that were let go are closed.
void drain() {
    DeferredStoreCore::queue().sync([] {});
}

TEST(DeferredStore, KeepsRowsWhileTheVersionStaysAndDropsThemWhenItChanges) {
    const TemporaryDocuments documents;
    const CapturedLog log;
    {
        DeferredStore<Note> store("main");
        addNote(store);
    }
    EXPECT_EQ(log.count(std::string(dropMessage) + "nil, currentVersion=3"), 1);
    {
        DeferredStore<Note> store("main");
        EXPECT_EQ(allNotes(store).size(), 1U);
    }
    drain();
    EXPECT_EQ(log.count(dropMessage), 1);
    Store<VersionEntity>(StoreLocation::default_("main")).insert({"notes", 1});
    DeferredStore<Note> store("main");
    store.perform([](Store<Note>& notes) { notes.createTable(); });
    EXPECT_TRUE(allNotes(store).empty());
    EXPECT_EQ(log.count(std::string(dropMessage) + "Optional(1), currentVersion=3"), 1);
    drain();
}

TEST(DeferredStore, OneThatIsGoneBeforeItsTurnTouchesNothing) {
    const TemporaryDocuments documents;
    const CapturedLog log;
    auto& queue = DeferredStoreCore::queue();
    queue.suspend();
    { const DeferredStore<Note> store("main"); }
    queue.resume();
    drain();
    EXPECT_TRUE(log.lines().empty());
    EXPECT_TRUE(std::filesystem::is_empty(documents.path()));
}

TEST(DeferredStore, DecidesNothingByWhatAnotherProcessIsAboutToChange) {
    const TemporaryDocuments documents;
    const auto other = std::make_shared<StoreConnection>(StoreLocation::default_("main"));
    Store<VersionEntity> versions(other);
    versions.createTable();
    StoreConnection::setBusyTimeout(std::chrono::milliseconds(20));
    other->transaction([&] {
        versions.insert({"notes", Note::schemaVersion});
        const CapturedLog log;
        DeferredStore<Note> tooEarly("main");
        addNote(tooEarly);
        EXPECT_EQ(log.count("database is locked"), 1);
        EXPECT_EQ(log.count(dropMessage), 0) << "the table is the other's by now";
    });
    drain();
}

TEST(DeferredStore, AFileThatIsLostIsMadeAnewAndItsUserIsToldOnce) {
    const struct {
        const char* name;
        std::function<void(const std::filesystem::path&)> lose;
        bool isOpen;
    } cases[] = {
        {"removed", [](const auto& file) { std::filesystem::remove(file); }, true},
        {"removed with its directory", [](const auto& file) { std::filesystem::remove_all(file.parent_path()); }, true},
        {"replaced", [](const auto& file) { std::filesystem::rename(file, file.string() + ".aside"); }, true},
        {"removed while closed", [](const auto& file) { std::filesystem::remove(file); }, false},
    };
    for (const auto& one : cases) {
        SCOPED_TRACE(one.name);
        const TemporaryDocuments documents;
        const auto insert = [](Store<Note>& notes) { notes.insert({.identifier = "b"}); };
        {
            DeferredStore<Note> store("main");
            addNote(store);
            if (!one.isOpen) store.perform([](Store<Note>& notes) { notes.close(); });
            one.lose(documents / "com.veskar.corvane.main.db");
            EXPECT_THROW(store.perform(insert), StoreError);
            EXPECT_NO_THROW(store.perform(insert));
            EXPECT_EQ(store.perform([](Store<Note>& notes) { return notes.isOpen(); }), one.isOpen);
        }
        drain();
        DeferredStore<Note> nextRun("main");
        EXPECT_EQ(allNotes(nextRun), std::vector{Note{.identifier = "b"}});
        drain();
    }
}

TEST(DeferredStore, FallsBackToMemoryWhenALostFileCannotBeMadeAnew) {
    const CapturedLog log;
    const TemporaryDocuments documents;
    DocumentsDirectory::set(documents / "in");
    DeferredStore<Note> store("main");
    addNote(store);
    std::filesystem::remove_all(documents / "in");
    writeFile(documents / "in", "");
    EXPECT_THROW(addNote(store), StoreError);
    EXPECT_EQ(allNotes(store).size(), 1U);
    EXPECT_EQ(log.count("Failed to create store for notes, error="), 1);
}

}  // namespace
}  // namespace corvane::test
