#pragma once

#include <corvane/Store/DeferredStoreCore.h>
#include <corvane/Store/Store.h>

#include <memory>
#include <optional>
#include <string>
#include <type_traits>
#include <utility>

namespace corvane {

/// The way to a `Store` for everyone else: made off the caller's thread, versioned, and used on one queue only.
///
/// Making one returns at once. On the shared queue its database is opened and its table dropped if the code's schema
/// version is another than the one on disk; when the file cannot be used, a database in memory takes its place for the
/// life of the process (an error line is logged, and what is kept there is lost at its end). The table itself is
/// created by the owner, when it opens the store.
///
/// When the file is removed or replaced while the store is in use, the next `perform` makes a new one with its table,
/// runs its operation on that, and then throws: the operation is done, and what was stored before is lost.
///
/// Safe from any thread. Releasing it never waits.
///
///     DeferredStore<Note> store(endpoint.name());
///     store.perform([&](Store<Note>& notes) { notes.insert(note); });
///     auto all = store.perform([](Store<Note>& notes) { return notes.fetchAll(); });
template <Storable Entity>
class DeferredStore {
  public:
    using Errors = DeferredStoreError;

    /// @param location the name of the database file; nothing for a database in memory.
    /// @param durability what is stored survives that, once an operation has returned
    explicit DeferredStore(std::optional<std::string> location, Durability durability = Durability::processKill)
        : core_(DeferredStoreCore::make(Store<Entity>::table(), Entity::schemaVersion, std::move(location),
                                        durability)) {}
    DeferredStore(const DeferredStore&) = delete;
    DeferredStore& operator=(const DeferredStore&) = delete;

    /// Runs `operation` on the shared queue with the `Store<Entity>&`, and returns its result or rethrows its error.
    /// Waits for everything enqueued before, the making of the store included. Throws `Errors` noStore when there is no
    /// store, and `Store::Errors` cantOpen when the file had been lost. The reference is good for the length of the
    /// call.
    ///
    /// Requires: the caller is not on the shared queue; `operation` waits for no other queue.
    template <class Operation>
    auto perform(Operation&& operation) {
        using Result = std::invoke_result_t<Operation, Store<Entity>&>;
        if constexpr (std::is_void_v<Result>) {
            core_->perform([&](const std::shared_ptr<StoreConnection>& connection) {
                Store<Entity> store(connection);
                operation(store);
            });
        } else {
            std::optional<Result> result;
            perform([&](Store<Entity>& store) { result.emplace(operation(store)); });
            return *std::move(result);
        }
    }

    /// Inside `perform`: calls `operations` in a transaction that finds nothing of an earlier epoch in the table. What
    /// they do is done all or not at all, and no other process writes, or begins an epoch that was not seen, before.
    void transaction(FunctionRef<void()> operations) { core_->transaction(operations); }
    /// `perform` of one such transaction.
    template <class Operation>
    void change(Operation&& operation) {
        perform([&](Store<Entity>& store) { transaction([&] { operation(store); }); });
    }

    /// Whether a transaction on `connection` holds for this store too: both are on one file. Requires: on the shared
    /// queue, as inside another store's `perform`.
    [[nodiscard]] bool sharesFileWith(const StoreConnection& connection) const {
        return core_->sharesFileWith(connection);
    }
    /// Whether the store is in memory, or there is none. Requires: on the shared queue.
    [[nodiscard]] bool isInMemory() const { return core_->isInMemory(); }

  private:
    const std::shared_ptr<DeferredStoreCore> core_;
};

}  // namespace corvane
