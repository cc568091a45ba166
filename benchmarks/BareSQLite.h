#pragma once

#include <sqlite3.h>

#include <filesystem>
#include <memory>
#include <string>

namespace corvane::bench {

/// A database in the mode that the library uses, and nothing else.
class BareSQLite {
  public:
    explicit BareSQLite(const std::filesystem::path& file);

    /// Prepares, runs and finalizes one statement.
    void run(const std::string& sql);

    /// One row of the library's backup table as SQL text, with `events` bytes written in hexadecimal digits.
    static std::string rowOf(const std::string& hexDigits);
    static std::string deletionOfRow();

  private:
    struct Close {
        void operator()(sqlite3* database) const noexcept { sqlite3_close_v2(database); }
    };
    std::unique_ptr<sqlite3, Close> database_;
};

}  // namespace corvane::bench
