#pragma once

#include <corvane/Platform/SerialQueue.h>
#include <corvane/Processing/EventProcessorType.h>
#include <corvane/Testing/RecordedEvent.h>

#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

namespace corvane::test {

/// A processor that keeps what it is told, and answers questions about it.
///
/// Every question waits first until what was submitted before it has been processed, so a test neither sleeps nor
/// polls. Asked on the access queue itself, from a transaction's block, it answers with what is there. It waits as
/// long as it takes: for ever when the host has suspended the queue. Answers are copies. All operations may be called
/// from any thread.
///
///     auto recording = std::make_shared<RecordingProcessor>();
///     sessions.processorManager()->add(recording);
///     ...
///     recording->only("ScreenView").at("screen.name").string();                       // "home"
///     EXPECT_EQ(recording->checkOnly("ScreenView", {{"screen.name", "home"}}), "");   // says what went wrong
class RecordingProcessor : public EventProcessorType {
  public:
    /// Waits until everything that was enqueued on the access queue before has run; on that queue, and before the
    /// processor was added to a manager, it does nothing.
    void settle() const;

    /// The events, in the order in which they were processed.
    [[nodiscard]] std::vector<RecordedEvent> events() const;
    /// Those of one name.
    [[nodiscard]] std::vector<RecordedEvent> events(std::string_view name) const;
    /// The one event of this name. Throws `std::runtime_error` when there is none or more than one; its message lists
    /// what was recorded.
    [[nodiscard]] RecordedEvent only(std::string_view name) const;

    /// Assertions for any test framework, or none: each gives an empty text when it holds, and otherwise a message that
    /// says what was expected and lists what was recorded.
    /// @{
    /// Exactly one event has this name and these fields; there may be others of the name.
    [[nodiscard]] std::string checkOnly(std::string_view name, const std::vector<ExpectedField>& fields = {}) const;
    /// So many events have this name and these fields.
    [[nodiscard]] std::string checkCount(std::size_t count, std::string_view name,
                                         const std::vector<ExpectedField>& fields = {}) const;
    /// The events have these names, in this order, and there are no others. Without names: nothing was recorded.
    [[nodiscard]] std::string checkNames(const std::vector<std::string>& names) const;
    /// @}

    /// What the processor was told, a line for each callback, in order: "start", "update", "update+submit" (the host
    /// asked for what is queued to be sent), "end", "process <event>", "enter <group>", "leave <group>".
    [[nodiscard]] std::vector<std::string> history() const;
    /// The session as it was at each "start", "update", "update+submit" and "end" of the history.
    [[nodiscard]] std::vector<Session> sessions() const;
    /// When the sessions ended.
    [[nodiscard]] std::vector<Date> endDates() const;
    /// The groups that were entered.
    [[nodiscard]] std::vector<Group> groups() const;
    /// Forgets everything up to now.
    void clear();

    /// Whether the calling code runs on the access queue.
    [[nodiscard]] bool isOnQueue() const;

    // What the library calls.
    void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) override;
    void process(const ProcessEvent& event) override;
    void didEnterGroup(const Group& group) override;
    void didLeaveGroup(const Group& group) override;
    void didStartSession(const Session& session) override;
    void didUpdateSession(const Session& session, bool submitQueues) override;
    void didEndSession(const Session& session, Date endDate) override;

  private:
    struct Record {
        std::vector<std::string> history;
        std::vector<RecordedEvent> events;
        std::vector<Session> sessions;
        std::vector<Date> endDates;
        std::vector<Group> groups;
    };
    friend class ManualClock;

    [[nodiscard]] std::vector<std::shared_ptr<SerialQueue>> queues() const;
    /// As `settle`, by the queue's own thread, which looks after timers.
    void settleByWorker() const;
    void note(const char* what, const Session& session);

    mutable std::mutex mutex_;
    Record record_;
    std::vector<std::shared_ptr<SerialQueue>> queues_;
};

}  // namespace corvane::test
