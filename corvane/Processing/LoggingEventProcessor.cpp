#include <corvane/Processing/LoggingEventProcessor.h>

#include <corvane/Platform/Error.h>
#include <corvane/Platform/Log.h>

namespace corvane {

namespace {
bool isVisible() {
    return Log::shared().isEnabled(LogLevel::debug);
}
}  // namespace

LoggingEventProcessor::LoggingEventProcessor(const LoggingEventProcessorFormat& logFormat)
    : logFormatter_(logFormat.formatter()) {}
LoggingEventProcessor::~LoggingEventProcessor() = default;

void LoggingEventProcessor::registerAccessQueue(std::shared_ptr<SerialQueue>) {}

void LoggingEventProcessor::process(const ProcessEvent& processEvent) {
    if (isVisible()) Log::shared().debug("%@", LogLines{logFormatter_->format(processEvent)});
}

void LoggingEventProcessor::didEnterGroup(const Group& group) {
    if (!isVisible()) return;
    Log::shared().debug("Entering group, name=%@ startDate=%@", group.name, description(group.startDate));
}

void LoggingEventProcessor::didLeaveGroup(const Group& group) {
    Log::shared().debug("Leaving group, name=%@", group.name);
}

void LoggingEventProcessor::didStartSession(const Session& session) {
    if (!isVisible()) return;
    Log::shared().debug("Started session, identifier=%@, startDate=%@, sessionData=%@", session.identifier,
                        description(session.startDate), session.sessionData.description());
}

void LoggingEventProcessor::didUpdateSession(const Session& session, bool) {
    if (!isVisible()) return;
    Log::shared().debug("Updated session, identifier=%@, startDate=%@, sessionData=%@", session.identifier,
                        description(session.startDate), session.sessionData.description());
}

void LoggingEventProcessor::didEndSession(const Session& session, Date endDate) {
    if (!isVisible()) return;
    Log::shared().debug("Ended session, identifier=%@, startDate=%@, endDate=%@, sessionData=%@", session.identifier,
                        description(session.startDate), description(endDate), session.sessionData.description());
}

std::string DefaultLoggingEventProcessorFormatter::format(const ProcessEvent& processEvent) const {
    if (!processEvent.json().exists()) return processEvent.name() + " ~> nil";
    return processEvent.name() + " -> " + processEvent.json().description();
}

JSONLoggingEventProcessorFormatter::JSONLoggingEventProcessorFormatter(
    JSONWritingOptions writingOptions, std::shared_ptr<const LoggingEventProcessorFormatterType> fallbackFormatter)
    : writingOptions_(writingOptions), fallbackFormatter_(std::move(fallbackFormatter)) {
    if (!fallbackFormatter_) throw InvalidArgument("there is no fallback for the JSON formatter");
}
JSONLoggingEventProcessorFormatter::~JSONLoggingEventProcessorFormatter() = default;

std::string JSONLoggingEventProcessorFormatter::format(const ProcessEvent& processEvent) const {
    // Text that was taken as encoded is looked at here: a line that claims to be JSON shall be.
    if (!processEvent.json().exists()) return fallbackFormatter_->format(processEvent);
    try {
        return processEvent.name() + " -> " + processEvent.json().toData(writingOptions_);
    } catch (const JSONError&) {
        return fallbackFormatter_->format(processEvent);
    }
}

LoggingEventProcessorFormat LoggingEventProcessorFormat::json(JSONWritingOptions writingOptions) {
    return LoggingEventProcessorFormat(std::make_shared<JSONLoggingEventProcessorFormatter>(
        writingOptions, std::make_shared<DefaultLoggingEventProcessorFormatter>()));
}

LoggingEventProcessorFormat LoggingEventProcessorFormat::custom(
    std::shared_ptr<const LoggingEventProcessorFormatterType> formatter) {
    if (!formatter) throw InvalidArgument("there is no formatter for the logging processor");
    return LoggingEventProcessorFormat(std::move(formatter));
}

LoggingEventProcessorFormat LoggingEventProcessorFormat::default_() {
    return LoggingEventProcessorFormat(std::make_shared<DefaultLoggingEventProcessorFormatter>());
}

}  // namespace corvane
