#include <corvane/Agent/Host/BackgroundTransferTask.h>

#include <corvane/Agent/Host/BackgroundTransferCore.h>
#include <corvane/Agent/TransferSubmission.h>

#include <algorithm>
#include <utility>

namespace corvane {

BackgroundTransferTask::BackgroundTransferTask(std::weak_ptr<BackgroundTransferCore> core, std::int64_t identifier,
                                               TransferRequest request, std::filesystem::path file)
    : core_(std::move(core)),
      identifier_(identifier),
      token_(TransferSubmission::newToken()),
      request_(std::move(request)),
      file_(std::move(file)),
      isOfThisRun_(true) {}

BackgroundTransferTask::BackgroundTransferTask(std::weak_ptr<BackgroundTransferCore> core, std::int64_t identifier,
                                               std::string token, std::optional<std::string> description)
    : core_(std::move(core)),
      identifier_(identifier),
      token_(std::move(token)),
      isOfThisRun_(false),
      description_(std::move(description)),
      state_(State::running),
      keeper_(Keeper::agent),
      accepted_(true) {}

std::optional<std::string> BackgroundTransferTask::description() const {
    std::lock_guard lock(mutex_);
    return description_;
}

void BackgroundTransferTask::setDescription(std::string description) {
    {
        std::lock_guard lock(mutex_);
        description_ = description;
        if (keeper_ != Keeper::agent) return;  // goes along with the submission
    }
    if (const auto core = core_.lock()) core->describe(token_, std::move(description));
}

TransferTask::State BackgroundTransferTask::state() const {
    std::lock_guard lock(mutex_);
    return state_;
}

void BackgroundTransferTask::resume() {
    const auto core = core_.lock();
    if (!core) return;
    {
        std::lock_guard lock(mutex_);
        if (state_ != State::suspended) return;
        state_ = State::running;
    }
    core->start(shared_from_this());
}

bool BackgroundTransferTask::isKeptBy(Keeper keeper) const {
    std::lock_guard lock(mutex_);
    return keeper_ == keeper;
}

bool BackgroundTransferTask::moveTo(Keeper keeper) {
    std::lock_guard lock(mutex_);
    if (state_ != State::running || keeper_ >= keeper) return false;
    keeper_ = keeper;
    return true;
}

void BackgroundTransferTask::setSpooled() {
    std::lock_guard lock(mutex_);
    spooled_ = true;
}

bool BackgroundTransferTask::isUnanswered() const {
    std::lock_guard lock(mutex_);
    return spooled_ && !accepted_;
}

void BackgroundTransferTask::setAccepted() {
    std::lock_guard lock(mutex_);
    accepted_ = true;
}

bool BackgroundTransferTask::isAccepted() const {
    std::lock_guard lock(mutex_);
    return accepted_;
}

void BackgroundTransferTask::setCompleted() {
    std::lock_guard lock(mutex_);
    state_ = State::completed;
}

// A body that is sent again after the agent was lost starts anew; nothing is reported until it is beyond what was.
bool BackgroundTransferTask::note(std::int64_t total, std::int64_t expected) {
    std::lock_guard lock(mutex_);
    if (total <= reported_) return false;
    noted_.total = std::max(noted_.total, total);
    noted_.expected = expected;
    return !std::exchange(reportPending_, true);
}

BackgroundTransferTask::Progress BackgroundTransferTask::takeProgress() {
    std::lock_guard lock(mutex_);
    reportPending_ = false;
    noted_.step = noted_.total - std::exchange(reported_, noted_.total);
    return noted_;
}

}  // namespace corvane
