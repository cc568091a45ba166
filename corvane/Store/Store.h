#pragma once

#include <corvane/Store/Storable.h>
#include <corvane/Store/StoreConnection.h>
#include <corvane/Store/StoreTable.h>

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace corvane {

/// The records of one entity type, in one table of one database.
///
/// A store starts open. Any operation may be used on a closed one: it opens the database, runs, and closes it again; so
/// owners keep a store open over a burst of work. Nothing is logged here: every operation throws `Errors`
/// (`InvalidArgument` for a value that no statement can hold), and returns no partial result. Use it from one queue at
/// a time; the library's stores are reached through a `DeferredStore`, which sees to that.
///
///     Store<Note> store(StoreLocation::default_("main"));
///     store.createTable();
///     store.insert(note);
///     std::vector<Note> found = store.fetchWhere("identifier", "n1");
template <Storable Entity>
class Store {
  public:
    using Errors = StoreError;

    /// Opens the database. Throws what `open` throws.
    explicit Store(StoreLocation location) : Store(std::make_shared<StoreConnection>(std::move(location))) {}
    /// A store over a connection that there is already.
    explicit Store(std::shared_ptr<StoreConnection> connection) : connection_(std::move(connection)) {}

    /// Opens the database unless it is open.
    void open() { connection_->open(); }
    /// Closes the database; a memory store keeps what it holds until it is destroyed.
    void close() { connection_->close(); }
    [[nodiscard]] bool isOpen() const { return connection_->isOpen(); }

    /// Creates the table, and its companions, unless they are there.
    void createTable() { connection_->createTable(table()); }
    /// Drops the table if it is there.
    void dropTable() { connection_->run(table().dropSQL()); }

    /// Writes a record, in place of one with the same key.
    void insert(const Entity& entity) { connection_->run(table().insertSQL(values(entity))); }

    /// Writes a record, or adds its numbers to those of the one with the same key.
    void add(const Entity& entity) { connection_->run(table().addSQL(values(entity))); }

    /// All records, in no particular order. A record that cannot be read fails the whole call with its error.
    [[nodiscard]] std::vector<Entity> fetchAll() { return fetch(table().selectSQL()); }
    /// The records whose `column` equals `value`.
    [[nodiscard]] std::vector<Entity> fetchWhere(std::string_view column, const StorableValue& value) {
        return fetch(table().selectSQL(column, value));
    }
    /// The key of every record as text, in the order in which they were written last. Reads nothing else of them.
    [[nodiscard]] std::vector<std::string> keys() {
        std::vector<std::string> keys;
        connection_->query(table().keysSQL(), [&](StoreStepper& stepper) {
            if (auto key = stepper.optionalText()) keys.push_back(*std::move(key));
        });
        return keys;
    }
    /// Deletes the records whose `column` equals `value`, if there are any.
    void deleteWhere(std::string_view column, const StorableValue& value) {
        connection_->run(table().deleteSQL(column, value));
    }

    /// Deletes the records whose `column` equals `value`, and returns them.
    [[nodiscard]] std::vector<Entity> takeWhere(std::string_view column, const StorableValue& value) {
        return fetch(table().takeSQL(column, value));
    }
    /// The number of records, and the sums of their columns of type INTEGER, in table order.
    [[nodiscard]] std::vector<std::int64_t> sums() {
        std::vector<std::int64_t> sums(1);
        for (const auto& column : table().columns()) sums.resize(sums.size() + (column.type == "INTEGER" ? 1 : 0));
        connection_->query(table().sumsSQL(), [&](StoreStepper& stepper) {
            for (auto& sum : sums) sum = stepper.integer();
        });
        return sums;
    }

    /// Calls `operations`: what they do here is done all or not at all, and no other process writes in between. What
    /// they throw undoes them and comes through.
    void transaction(FunctionRef<void()> operations) { connection_->transaction(operations); }

    /// What the store works on, for other tables of the same file.
    [[nodiscard]] const std::shared_ptr<StoreConnection>& connection() const { return connection_; }

    /// The entity's table and its statements.
    [[nodiscard]] static const StoreTable& table() {
        static const auto& table = *new StoreTable(makeTable());
        return table;
    }

  private:
    static StoreTable makeTable() {
        if constexpr (requires { Entity::extras(); }) {
            return {Entity::tableName, Entity::columns(), Entity::extras()};
        } else {
            return {Entity::tableName, Entity::columns()};
        }
    }
    static std::vector<StorableValue> values(const Entity& entity) {
        return table().values([&](const std::string& column) { return entity.storableValue(column); });
    }
    std::vector<Entity> fetch(const std::string& sql) {
        std::vector<Entity> entities;
        connection_->query(sql, [&](StoreStepper& stepper) { entities.push_back(Entity::read(stepper)); });
        return entities;
    }

    std::shared_ptr<StoreConnection> connection_;
};

}  // namespace corvane
