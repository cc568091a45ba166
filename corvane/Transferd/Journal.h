#pragma once

#include <corvane/Platform/TransferSubmission.h>

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

struct sqlite3;

namespace corvane::transferd {

/// What the agent must not forget when it is killed: its tasks, how they ended, and whom to wake. A SQLite database;
/// its page in docs/formats has the tables.
///
/// A change is safe from a kill of the process when the call returns. All operations throw `InvalidArgument` with the
/// database's words when it cannot be read or written.
class Journal {
  public:
    struct Task {
        std::int64_t number = 0;
        /// In milliseconds since 1970.
        std::int64_t accepted = 0;
        TransferSubmission submission;
        bool isOver = false;
    };
    struct Wake {
        std::string session;
        std::string owner;
        std::vector<std::string> command;
    };

    /// Opens or creates the file. One that is damaged is moved aside, which `problem` then tells of. Throws for one
    /// that another version has written, too.
    Journal(const std::filesystem::path& file, std::string& problem);
    ~Journal();

    /// Every task, in the order in which they were accepted. A row that cannot be read is removed.
    void forEach(const std::function<void(Task)>& visit);
    /// Keeps a task, and gives it its number.
    std::int64_t add(const TransferSubmission& submission, std::int64_t accepted);
    void finish(std::int64_t number, std::string_view outcome);
    void forget(std::int64_t number);
    void describe(std::int64_t number, const std::string& description);

    [[nodiscard]] TransferSubmission submission(std::int64_t number);
    [[nodiscard]] std::optional<std::string> description(std::int64_t number);
    /// The bytes that `finish` was given.
    [[nodiscard]] std::string outcome(std::int64_t number);

    void setWake(const Wake& wake);
    [[nodiscard]] std::vector<Wake> wakes();

  private:
    class Statement;
    struct Close {
        void operator()(sqlite3* database) const noexcept;
    };

    void open(const std::filesystem::path& file);
    void run(const char* sql);

    std::unique_ptr<sqlite3, Close> database_;
};

}  // namespace corvane::transferd
