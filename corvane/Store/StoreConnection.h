#pragma once

#include <corvane/Platform/Durability.h>
#include <corvane/Platform/FunctionRef.h>
#include <corvane/Store/StoreError.h>
#include <corvane/Store/StoreLocation.h>
#include <corvane/Store/StoreStepper.h>
#include <corvane/Store/StoreTable.h>

#include <chrono>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>

namespace corvane {

/// The database connection under a `Store`: opens and closes it and runs whole statements.
///
/// Lives on one queue at a time, like its store. A statement on a closed connection opens it for its own length. A
/// connection to memory stays open until it is destroyed, for closing it would lose what it holds.
///
/// File databases are created 0600 in the documents directory, in write-ahead mode with a busy timeout, so that two
/// stores, and two processes, can share a file. Not getting that mode is not a failure to open. A statement waits for
/// another process's lock up to the busy timeout; once that was in vain, the next ones hardly wait until one can write,
/// so that a lock that is never released costs its user one timeout and not one per statement.
class StoreConnection {
  public:
    /// Opens the database. Throws what `open` throws.
    /// @param durability what a change survives that was done
    explicit StoreConnection(StoreLocation location, Durability durability = Durability::processKill);
    StoreConnection(const StoreConnection&) = delete;
    StoreConnection& operator=(const StoreConnection&) = delete;
    ~StoreConnection();

    /// Opens the database unless it is open. Throws `StoreError` cantOpen, also when there is no documents directory to
    /// be had or the location's name cannot name a file; the connection is then closed.
    void open();
    /// Closes a file database; harmless on a closed one. Memory stays open.
    void close() noexcept;
    [[nodiscard]] bool isOpen() const noexcept;

    [[nodiscard]] const StoreLocation& location() const noexcept { return location_; }
    /// The database file's path; empty for memory.
    [[nodiscard]] const std::string& file() const noexcept { return path_; }

    /// Whether the file that was opened last has since been removed, or another has taken its name. The database goes
    /// on writing to such a file and reports no error, though nobody will ever read it.
    [[nodiscard]] bool hasLostItsFile() const noexcept;
    /// Whether both are connections to one and the same file, so that a transaction of the one holds for the other.
    [[nodiscard]] bool sharesFileWith(const StoreConnection& other) const noexcept {
        return opened_ && opened_ == other.opened_;
    }
    /// Opens the database again under its name, with its directory if that has gone too. Throws what `open` throws.
    void reopen();

    /// Runs a statement that changes something. Throws `StoreError`.
    void run(const std::string& sql);
    /// Creates a table and its companions unless they are there. Throws `StoreError`.
    void createTable(const StoreTable& table);
    /// Runs a query and calls `readRow` for every result row. Throws `StoreError`, or what `readRow` throws, which ends
    /// the query.
    void query(const std::string& sql, FunctionRef<void(StoreStepper&)> readRow);
    /// Calls `statements`, whose statements are done all or not at all, and with no other process's between them.
    /// Throws `StoreError`, or what `statements` throws, which undoes them.
    void transaction(FunctionRef<void()> statements);

    /// The busy timeout of connections that are opened from now on, in the whole process.
    static void setBusyTimeout(std::chrono::milliseconds timeout) noexcept;

  private:
    struct Handle;
    class OnDemand;
    struct FileIdentity {
        std::uint64_t device = 0, node = 0;
        bool operator==(const FileIdentity&) const = default;
    };

    /// What is under the name now; nothing when there is no file.
    [[nodiscard]] std::optional<FileIdentity> fileIdentity() const noexcept;
    /// Not once a lock was waited for in vain, until something could be written.
    void setPatient(bool patient) noexcept;
    void applyPatience() noexcept;

    /// The database file, made if it is missing; it is looked up once, so that a later change of directory does not
    /// split the data.
    const std::string& path();

    const StoreLocation location_;
    const Durability durability_;
    std::string path_;
    std::unique_ptr<Handle> handle_;
    std::optional<FileIdentity> opened_;  // the file of the last opening
    bool isPatient_ = true;
};

}  // namespace corvane
