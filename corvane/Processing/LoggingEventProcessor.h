#pragma once

#include <corvane/Export.h>
#include <corvane/Processing/EventProcessorType.h>
#include <corvane/Processing/LoggingEventProcessorFormat.h>

namespace corvane {

/// Writes every event, session change and group as one line to the library's log, at debug level: for developers who
/// watch. `Log::shared().setLevel(LogLevel::debug)` makes the lines visible; below that level nothing is formatted.
class CORVANE_EXPORT LoggingEventProcessor final : public EventProcessorType {
  public:
    explicit LoggingEventProcessor(
        const LoggingEventProcessorFormat& logFormat = LoggingEventProcessorFormat::default_());
    LoggingEventProcessor(const LoggingEventProcessor&) = default;
    ~LoggingEventProcessor() override;

    /// Does nothing: the processor keeps no queue.
    void registerAccessQueue(std::shared_ptr<SerialQueue> accessQueue) override;
    void process(const ProcessEvent& processEvent) override;
    void didEnterGroup(const Group& group) override;
    void didLeaveGroup(const Group& group) override;
    void didStartSession(const Session& session) override;
    void didUpdateSession(const Session& session, bool submitQueues) override;
    void didEndSession(const Session& session, Date endDate) override;

  private:
    const std::shared_ptr<const LoggingEventProcessorFormatterType> logFormatter_;
};

}  // namespace corvane
