#pragma once

#include <corvane/Agent/TransferSubmission.h>

#include <cstdint>
#include <filesystem>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

struct sqlite3;
struct sqlite3_stmt;

namespace corvane::transferd {

/// What the agent must not forget when it is killed: its tasks, how they ended, and whom to wake. A SQLite database;
/// its page in docs/formats has the tables.
///
/// A change is safe from a kill of the process when the call returns. All operations throw `JournalError` with the
/// database's words when it cannot be read or written.
class Journal {
  public:
    struct Task {
        std::int64_t number = 0;
        /// In milliseconds since 1970.
        std::int64_t accepted = 0;
        /// Nothing but the names of the task, the session and the owner when the rest cannot be read.
        TransferSubmission submission;
        bool isReadable = true;
        bool isOver = false;
    };

    /// Beyond this many owners, those that have not been heard of for the longest are not woken any more.
    static constexpr int mostWakes = 1000;

    /// Opens or creates the file, and takes over one of an earlier version. One that is damaged, anywhere, is moved
    /// aside, which `problem` then tells of. Throws for one that a later version has written, too.
    Journal(const std::filesystem::path& path, std::string& problem);
    ~Journal();

    /// Whether an operation has found damage: there is no going on with the file, and the next agent moves it aside.
    [[nodiscard]] bool isDamaged() const { return isDamaged_; }

    /// Every task, in the order in which they were accepted.
    void forEach(const std::function<void(Task)>& visit);
    /// Keeps a task, and gives it its number.
    std::int64_t accept(const TransferSubmission& submission, std::int64_t accepted);
    /// Calls `changes`: what they do here is done all or not at all. What they throw undoes them and comes through.
    void together(const std::function<void()>& changes);
    void complete(std::int64_t number, std::string_view outcome);
    void forget(std::int64_t number);
    void describe(std::int64_t number, const std::string& description);

    [[nodiscard]] TransferSubmission submission(std::int64_t number);
    [[nodiscard]] std::optional<std::string> description(std::int64_t number);
    /// The bytes that `complete` was given.
    [[nodiscard]] std::string outcome(std::int64_t number);

    /// Keeps the command for a month, from `now` on (in milliseconds since 1970), and lets go of older ones.
    void setWake(const std::string& session, const std::string& owner, const std::vector<std::string>& command,
                 std::int64_t now);
    /// Empty when there is none, or none that can be read.
    [[nodiscard]] std::vector<std::string> wake(const std::string& session, const std::string& owner);

  private:
    class Statement;
    struct Close {
        void operator()(sqlite3* database) const noexcept;
    };
    struct Finalize {
        void operator()(sqlite3_stmt* statement) const noexcept;
    };
    using Prepared = std::unique_ptr<sqlite3_stmt, Finalize>;

    void open(const std::filesystem::path& path);
    /// Makes a new file's tables, or an earlier version's into this one's.
    void takeOver(std::int64_t found);
    /// Looks at every page.
    void check();
    /// Looks whether tasks can have further numbers.
    void checkNumbers();
    void run(const char* sql);
    /// Notes whether the result tells of damage, and throws it.
    [[noreturn]] void fail(int code);

    std::unique_ptr<sqlite3, Close> database_;
    std::map<std::string_view, Prepared> prepared_;  // by their text, while they are not in use
    bool isDamaged_ = false;
};

}  // namespace corvane::transferd
