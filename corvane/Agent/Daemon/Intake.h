#pragma once

#include <corvane/Agent/AgentDirectory.h>
#include <corvane/Agent/Daemon/TaskBook.h>
#include <corvane/Agent/Daemon/UploadQueue.h>

#include <cstdint>
#include <string>

namespace corvane::transferd {

/// The way of a submission into the agent: from the spool into the journal, and from there into the queue of uploads.
///
/// A submission is accepted when the journal has it; only then does its file go. A kill in between leaves both, and the
/// token tells the next agent that they are one.
class Intake {
  public:
    Intake(const AgentDirectory& directory, TaskBook& book, UploadQueue& queue)
        : directory_(directory), book_(book), queue_(queue) {}

    /// Goes on with the tasks of the journal that are not over.
    void load();
    /// Accepts what the spool holds. What cannot be read stays nobody's: its host has not been told that it was
    /// accepted.
    void acceptSpooled();
    /// Accepts one submission, and returns its number; that of a task that the journal has already. Throws
    /// `FormatError` for one that no host of this user can have meant, which is removed; `JournalError` and
    /// `SystemError` when it cannot be had or kept now.
    std::int64_t accept(const std::string& token);

    /// Whether a task may be older than this agent: the machine may have lost its power since.
    [[nodiscard]] bool isEarlier(std::int64_t number) const { return number <= lastEarlier_; }

    /// There may be something new in the spool, or among the marks.
    void noteChange() { isChanged_ = true; }
    [[nodiscard]] bool isChanged() const { return isChanged_; }
    [[nodiscard]] bool takeChange() { return std::exchange(isChanged_, false); }

  private:
    /// The submission of a token as a host has left it.
    [[nodiscard]] TransferSubmission read(const std::string& token) const;
    /// Lets a task be uploaded. One that cannot even be queued is over.
    void enqueue(std::int64_t number, const TransferSubmission& submission);

    const AgentDirectory& directory_;
    TaskBook& book_;
    UploadQueue& queue_;
    bool isChanged_ = true;
    bool isFirstLook_ = true;
    std::int64_t lastEarlier_ = 0;
};

}  // namespace corvane::transferd
