#pragma once

#include <corvane/Platform/Mutex.h>
#include <corvane/Transfer/Description.h>
#include <corvane/Transfer/TransferSession.h>

#include <cstdint>
#include <optional>
#include <string>

namespace corvane {

/// What the tasks of every session have in common: who they are, and how much of the body has gone out. Internal; see
/// `TransferTask` for who holds a task and who may call it.
class SessionTask : public TransferTask {
  public:
    struct Progress {
        std::int64_t step = 0;
        std::int64_t total = 0;
        std::int64_t expected = 0;
    };

    explicit SessionTask(std::int64_t identifier, std::optional<std::string> description = {});

    [[nodiscard]] std::int64_t identifier() const override { return identifier_; }
    [[nodiscard]] std::optional<std::string> description() const override { return description_.get(); }
    void setDescription(std::string description) override;

    /// The end of the task's life: its state is completed from now on, and its session lets go of it.
    virtual void complete() = 0;

    /// Notes how much has gone out; true when a report is to be enqueued, which takes all that was noted by then: a
    /// large body and a busy queue do not make a heap of reports.
    [[nodiscard]] bool note(std::int64_t total, std::int64_t expected);
    [[nodiscard]] Progress takeProgress();

  private:
    const std::int64_t identifier_;
    Description description_;

    Mutex mutex_;
    Progress noted_ CORVANE_GUARDED_BY(mutex_);
    std::int64_t reported_ CORVANE_GUARDED_BY(mutex_) = 0;
    bool reportPending_ CORVANE_GUARDED_BY(mutex_) = false;
};

}  // namespace corvane
