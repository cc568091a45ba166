#include <corvane/Processing/LoggingEventProcessor.h>

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

}  // namespace corvane
