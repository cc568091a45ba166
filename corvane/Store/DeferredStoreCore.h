#pragma once

#include <corvane/Platform/Error.h>
#include <corvane/Platform/SerialQueue.h>
#include <corvane/Store/StoreConnection.h>
#include <corvane/Store/StoreTable.h>

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

namespace corvane {

/// What a deferred store itself throws: `DeferredStore<Entity>::Errors`. Domain "Corvane.DeferredStore.Errors".
class DeferredStoreError : public Error {
  public:
    enum Code {
        noStore = 0,  ///< neither the database file nor one in memory could be had; the log says why
    };
    explicit DeferredStoreError(Code code);
    DeferredStoreError(const DeferredStoreError&) = default;
    DeferredStoreError& operator=(const DeferredStoreError&) = default;
    ~DeferredStoreError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
};

/// What every `DeferredStore` does, whatever its entity: makes the connection on the shared queue, checks the table's
/// schema version, falls back to memory.
///
/// States: pending, then ready (on disk or in memory) or failed, for good.
class DeferredStoreCore {
  public:
    /// The one queue on which all database work of the process runs; never destroyed.
    [[nodiscard]] static SerialQueue& queue();

    /// Returns at once; the connection is made on the queue. When the core has gone by then, nothing is done.
    /// @param table must outlive the process's use of the core.
    /// @param location the name of the database file; nothing for memory.
    [[nodiscard]] static std::shared_ptr<DeferredStoreCore> make(const StoreTable& table, std::int64_t schemaVersion,
                                                                 std::optional<std::string> location,
                                                                 Durability durability = Durability::processKill);

    DeferredStoreCore(const DeferredStoreCore&) = delete;
    DeferredStoreCore& operator=(const DeferredStoreCore&) = delete;
    /// The connection is closed on the queue: closing may write to disk, and whoever lets go must not wait for it.
    ~DeferredStoreCore();

    /// The connection to use now. When its file has been removed or replaced, it is made anew first, with the table.
    /// Requires: on the queue. Throws `DeferredStoreError` noStore.
    [[nodiscard]] const std::shared_ptr<StoreConnection>& connection();
    /// Runs an operation on the queue, with the connection to use; throws when its file had been lost.
    void perform(FunctionRef<void(const std::shared_ptr<StoreConnection>&)> operation);
    /// Inside `perform`: calls `operations` in a transaction that finds nothing of an earlier epoch in the table.
    void transaction(FunctionRef<void()> operations);
    /// Whether the connection is to the same file as `other`. As it was used last: a file that was lost since is not
    /// made anew, which would wait for the transaction that asks. Requires: on the queue.
    [[nodiscard]] bool sharesFileWith(const StoreConnection& other) const;
    /// Whether there is no file under the connection. Requires: on the queue.
    [[nodiscard]] bool isInMemory() const;
    /// Throws `StoreError` cantOpen when the last `connection()` found its file lost. Requires: on the queue.
    void throwIfFileWasLost() const;

  private:
    DeferredStoreCore(const StoreTable& table, std::int64_t schemaVersion)
        : table_(table), schemaVersion_(schemaVersion) {}

    void makeAnew() CORVANE_REQUIRES(queue());
    /// Drops what the table holds of earlier epochs, as of now. Inside a transaction on the connection, so that nothing
    /// of an earlier epoch is written behind another process's back.
    void keepUp() CORVANE_REQUIRES(queue());

    const StoreTable& table_;
    const std::int64_t schemaVersion_;

    std::shared_ptr<StoreConnection> connection_ CORVANE_GUARDED_BY(queue());
    std::int64_t epoch_ CORVANE_GUARDED_BY(queue()) = 0;
    // Where the file was, when the last look found it gone.
    std::optional<StoreLocation> lost_ CORVANE_GUARDED_BY(queue());
};

}  // namespace corvane
