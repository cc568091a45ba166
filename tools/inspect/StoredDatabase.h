#pragma once

#include <corvane/Store/StoreStepper.h>

#include <filesystem>
#include <functional>
#include <memory>
#include <stdexcept>
#include <string>

struct sqlite3;

namespace inspect {

/// Something that cannot be read; the message is for people.
class Problem : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

/// A SQLite database of a program that may be running, looked at without changing it.
///
/// One that some process has open, or was killed with, has an index of its log beside it, and is read through that as
/// the process itself reads it: neither waits for the other. Any other one is copied first, with its log: to open it in
/// place would make files beside it. Not for several threads.
class StoredDatabase {
  public:
    /// Throws `Problem`.
    explicit StoredDatabase(const std::filesystem::path& file);
    ~StoredDatabase();
    StoredDatabase(const StoredDatabase&) = delete;
    StoredDatabase& operator=(const StoredDatabase&) = delete;

    using Row = std::function<void(corvane::StoreStepper& row)>;
    /// Has each row visited. A row that the visitor throws for is passed over, and counted. Throws `Problem`.
    /// @return how many were passed over
    std::size_t forEach(const std::string& query, const Row& visit);
    [[nodiscard]] bool hasTable(const std::string& name);

  private:
    struct Close {
        void operator()(sqlite3* database) const noexcept;
    };

    void copyTo(const std::filesystem::path& directory);

    const std::filesystem::path file_;
    std::filesystem::path copy_;  // a directory; empty without one
    std::unique_ptr<sqlite3, Close> database_;
};

}  // namespace inspect
