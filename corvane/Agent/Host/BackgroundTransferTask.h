#pragma once

#include <corvane/Platform/Mutex.h>
#include <corvane/Transfer/SessionTask.h>
#include <corvane/Transfer/TransferRequest.h>

#include <atomic>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace corvane {

class BackgroundTransferCore;

/// A task of a background session. Internal; see `TransferTask` for who holds it and who may call it.
class BackgroundTransferTask final : public SessionTask, public std::enable_shared_from_this<BackgroundTransferTask> {
  public:
    /// The life of a task, which only goes forward. There are two ways to its end, through the agent and inside the
    /// process; no task goes both:
    ///
    ///     suspended -> submitting -> spooled -> accepted -> reporting -> completed
    ///                      |            |          |                         ^
    ///                      +------------+----------+----> inside ------------+
    ///
    /// "A kill" is one of this process.
    enum class Stage {
        suspended,   ///< made. A kill leaves nothing here: the next run sends the file from its owner's books
        submitting,  ///< resumed, and on the way to the spool. A kill leaves a submission there, whole, or a part of
                     ///< one that the agent removes
        spooled,     ///< the submission is in the agent's spool. After a kill the agent takes it from there
        accepted,    ///< in the agent's journal, as its first word on the task or a listing has said. After a kill the
                     ///< agent goes on with it, and tells the next run
        inside,      ///< this process sends it, and has withdrawn it from the agent if it was there. A kill leaves the
                     ///< file to the owner's next run
        reporting,   ///< the agent has told how it ended; the report waits in the session's queue, or the delegate is
                     ///< being told. After a kill the agent tells the next run
        completed,   ///< the delegate has been told, or the session has gone. What the agent has not forgotten yet is
                     ///< acknowledged again when it comes up; a process that exits before leaves a mark for it, and
                     ///< after a kill in between the next run is told once more
    };

    /// A task of this run.
    BackgroundTransferTask(std::weak_ptr<BackgroundTransferCore> core, std::int64_t identifier, TransferRequest request,
                           std::filesystem::path bodyPath);
    /// A task of an earlier run, or of another process, that the agent has told of: an accepted one.
    BackgroundTransferTask(std::weak_ptr<BackgroundTransferCore> core, std::int64_t identifier, std::string token,
                           std::optional<std::string> description);

    void setDescription(std::string description) override;
    [[nodiscard]] State state() const override;
    void resume() override;
    void cancel() override;
    void complete() override { advanceTo(Stage::completed); }

    [[nodiscard]] const std::string& token() const { return token_; }
    [[nodiscard]] const TransferRequest& request() const { return request_; }
    [[nodiscard]] const std::filesystem::path& bodyPath() const { return bodyPath_; }
    [[nodiscard]] bool isOfThisRun() const { return isOfThisRun_; }

    /// Whether it is to stop. It goes its way to its end all the same: from `inside` as what runs there does; with the
    /// agent's word that it has no such task any more, after the mark that takes it back was made; at once when there
    /// is no agent to be had. One that was never resumed ends inside.
    [[nodiscard]] bool isCancelled() const { return isCancelled_; }

    /// The task of the session inside the process that sends it; nothing before `inside`.
    [[nodiscard]] std::shared_ptr<TransferTask> inner() const {
        Lock lock(mutex_);
        return inner_;
    }
    void setInner(std::shared_ptr<TransferTask> inner) {
        Lock lock(mutex_);
        inner_ = std::move(inner);
    }

    [[nodiscard]] Stage stage() const { return stage_; }
    /// Goes on to a later stage; stages may be left out. False, and the task stays where it is, when the stage does not
    /// lie ahead of it. Of several threads that try the same step one succeeds.
    bool advanceTo(Stage stage);
    /// Whether the agent may have the task and has not told how it ended.
    [[nodiscard]] bool isWithAgent() const;

  private:
    const std::weak_ptr<BackgroundTransferCore> core_;
    const std::string token_;
    const TransferRequest request_;
    const std::filesystem::path bodyPath_;
    const bool isOfThisRun_;
    std::atomic<Stage> stage_;
    std::atomic<bool> isCancelled_ = false;

    mutable Mutex mutex_;
    std::shared_ptr<TransferTask> inner_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane
