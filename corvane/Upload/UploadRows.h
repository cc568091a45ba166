#pragma once

#include <corvane/Platform/Error.h>
#include <corvane/Store/DeferredStore.h>
#include <corvane/Upload/LedgerBook.h>
#include <corvane/Upload/LedgerEntity.h>
#include <corvane/Upload/SignedEntity.h>
#include <corvane/Upload/UploadResult.h>

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace corvane {

/// The database's part in an endpoint's uploads: one row for each that is not over, one for what it holds, and the
/// totals of those that are. Callable from any thread but the store's queue, for which every call waits. Internal.
class UploadRows {
  public:
    using RemoveBackup = std::function<void(const std::shared_ptr<StoreConnection>&)>;

    struct Stored {
        std::vector<std::string> identifiers;  // in the order in which the rows were written last
        bool isInMemory = false;               // then they say nothing of what is on disk
    };
    /// An upload that is over, and what it counts as.
    struct Ending {
        std::string identifier;
        LedgerEntry entry;
    };

    UploadRows(std::shared_ptr<DeferredStore<SignedEntity>> deferredStore, std::shared_ptr<LedgerBook> book);

    /// Opens the database and creates the tables. Throws `StoreError` and `DeferredStoreError`, as all of these do.
    void open();
    void close();

    /// Writes a new upload's row, and has the backup of its contents removed, both or neither. Returns false, and has
    /// done nothing, when `epoch`, in which its contents were recorded, is over.
    [[nodiscard]] bool record(const SignedEntity& entity, const DocumentEntity& document, std::int64_t epoch,
                              const RemoveBackup& removeBackup);
    /// What is stored, once the books are in line with what releases that keep none have done. That they cannot be is
    /// logged.
    [[nodiscard]] Stored stored();
    /// The documents that are stored now.
    [[nodiscard]] std::vector<std::string> identifiers();
    [[nodiscard]] std::optional<SignedEntity> find(const std::string& identifier);
    struct Oldest {
        std::string identifier;
        std::int64_t bytes = 0;
        Date created;
    };
    /// So many of the documents that were handed over first, by the wall clock, in that order. Looks at every row.
    [[nodiscard]] std::vector<Oldest> oldest(std::size_t count);
    /// Counts a retry, in the upload's row only the first of a run. Returns false when there is no row.
    bool countRetry(const UploadResult::Retry& retry, bool isFirstOfRun = true);
    void end(const Ending& ending);
    /// Removes the rows of all of them or none, in which case it returns why. One whose row has gone already counts as
    /// nothing: who removed it has counted it.
    [[nodiscard]] std::optional<AnyError> end(const std::vector<Ending>& endings) noexcept;
    /// Writes what the ledger has in memory alone, if there is anything.
    void writeLedger();
    /// Reads the totals on disk, and what waits, into the book.
    void readLedger();

  private:
    using Rows = Store<SignedEntity>;

    /// Runs `operation`, which notes what it changes, in a transaction that writes the ledger, too.
    void change(FunctionRef<void(Rows&, LedgerBook::Changes&)> operation);
    void reconcile();
    void endAll(const std::vector<Ending>& endings);

    const std::shared_ptr<DeferredStore<SignedEntity>> deferredStore_;
    const std::shared_ptr<LedgerBook> book_;
};

}  // namespace corvane
