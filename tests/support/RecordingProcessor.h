#pragma once

#include <corvane/Platform/SerialQueue.h>
#include <corvane/Processing/EventProcessorType.h>

#include <memory>
#include <string>
#include <vector>

namespace corvane::test {

/// Keeps what a processor is told, as one line of text per callback. Read it on the access queue, or after `drain`.
class RecordingProcessor : public EventProcessorType {
  public:
    void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) override { queue_ = std::move(accessQueue); }
    void process(const ProcessEvent& event) override {
        events.push_back(event);
        calls.push_back("process " + event.name());
    }
    void didEnterGroup(const Group& group) override { calls.push_back("enter " + group.name); }
    void didLeaveGroup(const Group& group) override { calls.push_back("leave " + group.name); }
    void didStartSession(const Session& session) override { note("start", session); }
    void didUpdateSession(const Session& session, bool submitQueues) override {
        note(submitQueues ? "update+submit" : "update", session);
    }
    void didEndSession(const Session& session, Date endDate) override {
        note("end", session);
        endDates.push_back(endDate);
    }

    /// Waits until everything enqueued so far has run.
    void drain() const {
        queue_->sync([] {});
    }

    /// Whether the calling code runs on the access queue.
    [[nodiscard]] bool isOnQueue() const { return queue_->isCurrent(); }

    std::vector<std::string> calls;
    std::vector<ProcessEvent> events;
    std::vector<Session> sessions;
    std::vector<Date> endDates;

  private:
    void note(const char* what, const Session& session) {
        calls.emplace_back(what);
        sessions.push_back(session);
    }

    std::shared_ptr<SerialQueue> queue_;
};

}  // namespace corvane::test
