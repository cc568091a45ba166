#include <corvane/Processing/LoggingEventProcessorFormat.h>

#include <corvane/Platform/Error.h>

namespace corvane {

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
