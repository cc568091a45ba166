#pragma once

#include <corvane/Export.h>
#include <corvane/Models/ProcessEvent.h>
#include <corvane/Processing/EventProcessorType.h>

#include <memory>
#include <string>
#include <utility>
#include <variant>

namespace corvane {

/// Turns an event into the line that is logged for it. Called on the access queue.
class CORVANE_EXPORT LoggingEventProcessorFormatterType {
  public:
    virtual ~LoggingEventProcessorFormatterType() = default;
    [[nodiscard]] virtual std::string format(const ProcessEvent& processEvent) const = 0;

  protected:
    LoggingEventProcessorFormatterType() = default;
    LoggingEventProcessorFormatterType(const LoggingEventProcessorFormatterType&) = default;
    LoggingEventProcessorFormatterType& operator=(const LoggingEventProcessorFormatterType&) = default;
};

/// `ScreenView -> ["screen": ["name": "home"]]`, or `ScreenView ~> nil` for an event without a value.
class CORVANE_EXPORT DefaultLoggingEventProcessorFormatter final : public LoggingEventProcessorFormatterType {
  public:
    [[nodiscard]] std::string format(const ProcessEvent& processEvent) const override;
};

/// `ScreenView -> {"screen":{"name":"home"}}`; what the fallback returns for an event that is not a JSON document.
class CORVANE_EXPORT JSONLoggingEventProcessorFormatter final : public LoggingEventProcessorFormatterType {
  public:
    /// Throws `InvalidArgument` without a fallback.
    JSONLoggingEventProcessorFormatter(JSONWritingOptions writingOptions,
                                       std::shared_ptr<const LoggingEventProcessorFormatterType> fallbackFormatter);
    JSONLoggingEventProcessorFormatter(const JSONLoggingEventProcessorFormatter&) = default;
    JSONLoggingEventProcessorFormatter& operator=(const JSONLoggingEventProcessorFormatter&) = default;
    ~JSONLoggingEventProcessorFormatter() override;
    [[nodiscard]] std::string format(const ProcessEvent& processEvent) const override;

  private:
    JSONWritingOptions writingOptions_;
    std::shared_ptr<const LoggingEventProcessorFormatterType> fallbackFormatter_;
};

/// How the logging processor writes events: as JSON, by a formatter of the host's, or in the default form.
class CORVANE_EXPORT LoggingEventProcessorFormat {
  public:
    [[nodiscard]] static LoggingEventProcessorFormat json(JSONWritingOptions writingOptions = {});
    /// Throws `InvalidArgument` for a null pointer.
    [[nodiscard]] static LoggingEventProcessorFormat custom(
        std::shared_ptr<const LoggingEventProcessorFormatterType> formatter);
    [[nodiscard]] static LoggingEventProcessorFormat default_();

    [[nodiscard]] const std::shared_ptr<const LoggingEventProcessorFormatterType>& formatter() const {
        return formatter_;
    }

  private:
    explicit LoggingEventProcessorFormat(std::shared_ptr<const LoggingEventProcessorFormatterType> formatter)
        : formatter_(std::move(formatter)) {}

    std::shared_ptr<const LoggingEventProcessorFormatterType> formatter_;
};

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
