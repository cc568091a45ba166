#pragma once

#include <corvane/Transfer/TransferRequest.h>
#include <corvane/Transfer/TransferTask.h>

#include <cstdint>
#include <filesystem>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

namespace corvane {

class BackgroundTransferCore;

/// A task of a background session. Internal; see `TransferTask` for who holds it and who may call it.
class BackgroundTransferTask final : public TransferTask, public std::enable_shared_from_this<BackgroundTransferTask> {
  public:
    /// Who sends the body. It goes from the first to the last and never back.
    enum class Keeper {
        nobody,   ///< not resumed yet
        agent,    ///< submitted: in the agent's spool or journal
        process,  ///< the session inside the process
    };
    struct Progress {
        std::int64_t step = 0;
        std::int64_t total = 0;
        std::int64_t expected = 0;
    };

    /// A task of this run.
    BackgroundTransferTask(std::weak_ptr<BackgroundTransferCore> core, std::int64_t identifier, TransferRequest request,
                           std::filesystem::path file);
    /// A task of an earlier run, or of another process, that the agent has told of.
    BackgroundTransferTask(std::weak_ptr<BackgroundTransferCore> core, std::int64_t identifier, std::string token,
                           std::optional<std::string> description);

    [[nodiscard]] std::int64_t identifier() const override { return identifier_; }
    [[nodiscard]] std::optional<std::string> description() const override;
    void setDescription(std::string description) override;
    [[nodiscard]] State state() const override;
    void resume() override;

    [[nodiscard]] const std::string& token() const { return token_; }
    [[nodiscard]] const TransferRequest& request() const { return request_; }
    [[nodiscard]] const std::filesystem::path& file() const { return file_; }
    [[nodiscard]] bool isOfThisRun() const { return isOfThisRun_; }

    [[nodiscard]] bool isKeptBy(Keeper keeper) const;
    /// False when the keeper was this one, or a later one, already, and for a task that is over.
    bool moveTo(Keeper keeper);
    /// The submission is there for the agent to take, and has been taken.
    void setSpooled();
    void setAccepted();
    /// Whether the agent can have the submission and has not said so.
    [[nodiscard]] bool isUnanswered() const;
    [[nodiscard]] bool isAccepted() const;
    void setCompleted();

    /// Notes how much has gone out; true when a report is to be enqueued, which takes all that was noted by then.
    bool note(std::int64_t total, std::int64_t expected);
    [[nodiscard]] Progress takeProgress();

  private:
    const std::weak_ptr<BackgroundTransferCore> core_;
    const std::int64_t identifier_;
    const std::string token_;
    const TransferRequest request_;
    const std::filesystem::path file_;
    const bool isOfThisRun_;

    mutable std::mutex mutex_;  // guards these; never held while calling out
    std::optional<std::string> description_;
    State state_ = State::suspended;
    Keeper keeper_ = Keeper::nobody;
    bool spooled_ = false;
    bool accepted_ = false;
    Progress noted_;
    std::int64_t reported_ = 0;
    bool reportPending_ = false;
};

}  // namespace corvane
