#include <corvane/Transfer/SessionReporter.h>

#include "tests/support/Testing.h"

#include <atomic>

namespace corvane::test {
namespace {

using Ending = SessionReporter::Ending;

class Task final : public SessionTask {
  public:
    using SessionTask::SessionTask;
    State state() const override { return state_; }
    void resume() override {}
    void complete() override { state_ = State::completed; }

  private:
    std::atomic<State> state_ = State::running;
};

/// Writes down what it is told: how, and of which task.
class HostDelegate : public TransferSessionDelegate {
  public:
    void taskDidSendBodyData(const TransferTask&, std::int64_t, std::int64_t, std::int64_t) override {
        told += " sent";
    }
    void taskDidComplete(const TransferTask& task, const std::optional<AnyError>&,
                         const std::optional<TransferResponse>&) override {
        told += " one" + std::to_string(task.identifier());
    }
    void taskDidEndElsewhere(const TransferTask& task, const std::optional<AnyError>&,
                             const std::optional<TransferResponse>&) override {
        told += " elsewhere" + std::to_string(task.identifier());
    }
    void allEventsDelivered() override {}

    std::string told;
};

class LibraryDelegate final : public HostDelegate, public OwnDelegate {
  public:
    void tasksDidComplete(const std::vector<Completion>& completions) override {
        told += " together";
        for (const auto& [task, outcome] : completions) told += std::to_string(task.get().identifier());
        throw std::runtime_error("stopped at the call");
    }
};

TEST(SessionReporter, TellsTheLibrarysOwnDelegateTogetherWhatIsAtHandAndAHostsOneByOne) {
    const CapturedLog log;
    constexpr Ending completed = &TransferSessionDelegate::taskDidComplete;
    constexpr Ending elsewhere = &TransferSessionDelegate::taskDidEndElsewhere;
    const auto report = [&](const std::shared_ptr<HostDelegate>& delegate, const std::shared_ptr<SerialQueue>& queue) {
        const auto reporter = std::make_shared<SessionReporter>(delegate, queue);
        std::string afterwards;
        std::vector<std::shared_ptr<Task>> tasks;
        queue->suspend();
        for (const Ending ending : {completed, completed, elsewhere, completed}) {
            tasks.push_back(std::make_shared<Task>(static_cast<std::int64_t>(tasks.size() + 1)));
            reporter->enqueueEnd(tasks.back(), ending, {},
                                 [&, i = tasks.size()](bool isTold) { afterwards += std::to_string(isTold ? i : 0); });
        }
        reporter->reportProgress(tasks.front(), 1, 1);  // too late: its end is the last that is told of it
        queue->resume();
        queue->sync([] {});
        for (const auto& task : tasks) EXPECT_EQ(task->state(), TransferTask::State::completed);
        EXPECT_EQ(afterwards, "1234");
        return delegate->told;
    };
    EXPECT_EQ(report(std::make_shared<LibraryDelegate>(), std::make_shared<SerialQueue>("own")),
              " together12 elsewhere3 one4");
    EXPECT_EQ(report(std::make_shared<HostDelegate>(), std::make_shared<SerialQueue>("host")),
              " one1 one2 elsewhere3 one4");
    EXPECT_EQ(log.count("Host code failed, call=transfer session delegate"), 1);
}

}  // namespace
}  // namespace corvane::test
