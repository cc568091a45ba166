#include <corvane/Agent/Host/BackgroundTransferTask.h>

#include <corvane/Agent/Host/BackgroundTransferCore.h>
#include <corvane/Agent/TransferSubmission.h>

#include <utility>

namespace corvane {

BackgroundTransferTask::BackgroundTransferTask(std::weak_ptr<BackgroundTransferCore> core, std::int64_t identifier,
                                               TransferRequest request, std::filesystem::path bodyPath)
    : SessionTask(identifier),
      core_(std::move(core)),
      token_(TransferSubmission::newToken()),
      request_(std::move(request)),
      bodyPath_(std::move(bodyPath)),
      isOfThisRun_(true),
      stage_(Stage::suspended) {}

BackgroundTransferTask::BackgroundTransferTask(std::weak_ptr<BackgroundTransferCore> core, std::int64_t identifier,
                                               std::string token, std::optional<std::string> description)
    : SessionTask(identifier, std::move(description)),
      core_(std::move(core)),
      token_(std::move(token)),
      isOfThisRun_(false),
      stage_(Stage::accepted) {}

// Until the task is resumed its description goes along with the submission. The agent is told of one that changes while
// the submission is written: it may be too late for that.
void BackgroundTransferTask::setDescription(std::string description) {
    SessionTask::setDescription(description);
    if (!isWithAgent() && stage() != Stage::reporting) return;
    if (const auto core = core_.lock()) core->describe(token_, std::move(description));
}

TransferTask::State BackgroundTransferTask::state() const {
    const Stage now = stage();
    if (now == Stage::completed) return State::completed;
    if (isCancelled_) return State::cancelling;
    return now == Stage::suspended ? State::suspended : State::running;
}

void BackgroundTransferTask::resume() {
    const auto core = core_.lock();
    if (core && advanceTo(Stage::submitting)) core->start(shared_from_this());
}

void BackgroundTransferTask::cancel() {
    const auto core = core_.lock();
    if (core && !isCancelled_.exchange(true)) core->cancel(shared_from_this());
}

bool BackgroundTransferTask::advanceTo(Stage stage) {
    Stage from = stage_;
    do {
        const bool isOtherWay = from == Stage::inside && stage == Stage::reporting;
        if (from >= stage || isOtherWay) return false;
    } while (!stage_.compare_exchange_weak(from, stage));
    return true;
}

bool BackgroundTransferTask::isWithAgent() const {
    const Stage now = stage();
    return now == Stage::submitting || now == Stage::spooled || now == Stage::accepted;
}

}  // namespace corvane
