#pragma once

#include <corvane/Agent/Daemon/Journal.h>
#include <corvane/Transfer/TransferOutcome.h>

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

namespace corvane::transferd {

/// The agent's tasks and their owners: what the journal holds, with an index in memory that costs a task a few hundred
/// bytes. What reads the journal, and `accept` and `describe`, throw what it throws; the index then is as before.
///
///     accept -> open -> complete -> over -> forget
///                 +---------------------------^      withdrawn by its host, or discarded
///
/// `complete` and `forget` never fail: they are kept for `settle`, which comes back to what the journal does not take.
/// A kill before that leaves an open task, which is sent again, or one that is over, which is reported again.
class TaskBook {
  public:
    /// Beyond this many tasks no more are taken, so that a host that runs wild fills neither memory nor disk.
    static constexpr std::size_t mostTasks = 50'000;

    /// All hosts that use one session identifier with one owner key.
    struct Owner {
        std::string session;
        std::string key;
        std::vector<std::string> wakeCommand;
        std::set<std::int64_t> open;                 ///< tasks that are not over
        std::map<std::int64_t, std::uint64_t> over;  ///< tasks that are; with the client that was told, or 0
        bool isWoken = false;                        ///< the command was run, and no host has connected since
        std::int64_t lastHeard = 0;                  ///< when the journal was told of it, in milliseconds since 1970
    };
    struct Task {
        std::string token;
        Owner* owner = nullptr;
        std::int64_t expires = 0;     ///< when it stops waiting for its server, in milliseconds since 1970
        bool wantsProgress = true;    ///< of its body
        std::uint64_t submitter = 0;  ///< the client that asked for it to be taken, or 0
    };

    explicit TaskBook(Journal& journal) : journal_(journal) {}

    /// Reads the journal; `visit` gets every task that is not over. One that cannot be read has failed.
    void load(const std::function<void(std::int64_t number, const TransferSubmission&)>& visit);

    /// The owner, made when it is not known yet, with what the journal knows of it.
    Owner& owner(const std::string& session, const std::string& key);
    void setWakeCommand(Owner& owner, const std::vector<std::string>& command, std::int64_t now);
    /// Lets go of owners without a task that nothing else refers to.
    void dropOwners(const std::function<bool(const Owner&)>& isReferredTo);

    /// Takes a task into the journal, and gives it its number. `now` is in milliseconds since 1970. Throws
    /// `JournalError` also for one too many.
    std::int64_t accept(const TransferSubmission& submission, std::int64_t now);
    /// The task is over; the journal is told by `settle`.
    void complete(std::int64_t number, const TransferOutcome& outcome);
    /// The task is no more; its row goes with `settle`.
    void forget(std::int64_t number);
    /// Tells the journal what was completed and forgotten, together, since each turn of its pages costs as much as any
    /// other: before anybody else is told, and again when it could not take all, as on a full disk. Returns whether
    /// nothing is left to tell.
    bool settle();
    [[nodiscard]] bool isSettled() const { return unwritten_.empty() && unforgotten_.empty(); }
    [[nodiscard]] bool isDamaged() const { return journal_.isDamaged(); }
    void describe(std::int64_t number, const std::string& description) { journal_.describe(number, description); }

    /// The tasks, over or not, whose bodies lay beneath a directory, whatever both are called on the way there, and are
    /// there no more; nor need the directory be.
    [[nodiscard]] std::vector<std::int64_t> withBodiesGoneBeneath(const std::filesystem::path& directory);
    [[nodiscard]] std::optional<std::int64_t> find(std::string_view token) const;
    [[nodiscard]] Task& task(std::int64_t number) { return tasks_.at(number); }
    [[nodiscard]] bool contains(std::int64_t number) const { return tasks_.contains(number); }
    [[nodiscard]] std::size_t size() const { return tasks_.size(); }
    [[nodiscard]] std::map<std::pair<std::string, std::string>, Owner>& owners() { return owners_; }
    [[nodiscard]] TransferSubmission submission(std::int64_t number) { return journal_.submission(number); }
    [[nodiscard]] std::optional<std::string> description(std::int64_t number) { return journal_.description(number); }
    /// The bytes of an outcome; that of a failure when the journal's cannot be read.
    [[nodiscard]] std::string outcome(std::int64_t number);

  private:
    bool settleTogether();
    bool settleOneByOne();
    /// Ends a task whose submission cannot be read. Its host sends it again. Nobody can be told of one that is
    /// nobody's; the host misses it in the list.
    void failUnreadable(std::int64_t number);
    /// Enters a task of the journal into the index, and makes its owner known.
    void index(std::int64_t number, std::int64_t accepted, const TransferSubmission& submission, bool isOver);

    Journal& journal_;
    std::map<std::pair<std::string, std::string>, Owner> owners_;
    std::unordered_map<std::int64_t, Task> tasks_;
    std::unordered_map<std::string, std::int64_t> numbers_;
    std::map<std::int64_t, std::string> unwritten_;  // outcomes that the journal has not taken
    std::vector<std::int64_t> unforgotten_;          // rows that it has not removed
};

}  // namespace corvane::transferd
