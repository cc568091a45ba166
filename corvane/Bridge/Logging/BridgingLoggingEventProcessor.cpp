#include <corvane/Bridge/Logging/BridgingLoggingEventProcessor.h>

#include <corvane/Bridge/Models/BridgedError.h>

#include <memory>
#include <utility>

namespace corvane {

namespace {

class HostFormatter final : public LoggingEventProcessorFormatterType {
  public:
    explicit HostFormatter(BridgingLoggingEventProcessor::Formatter formatter) : formatter_(std::move(formatter)) {}
    [[nodiscard]] std::string format(const ProcessEvent& processEvent) const override {
        return formatter_(BridgedProcessEvent(processEvent));
    }

  private:
    const BridgingLoggingEventProcessor::Formatter formatter_;
};

LoggingEventProcessorFormat libraryFormat(BridgedLoggingEventProcessorFormat format,
                                          BridgingLoggingEventProcessor::Formatter formatter) {
    switch (format) {
        case BridgedLoggingEventProcessorFormat::json:
            return LoggingEventProcessorFormat::json();
        case BridgedLoggingEventProcessorFormat::custom:
            if (!formatter) throw BridgeError(BridgeError::missingObject, "the formatter of the custom format");
            return LoggingEventProcessorFormat::custom(std::make_shared<HostFormatter>(std::move(formatter)));
        case BridgedLoggingEventProcessorFormat::default_:
            return LoggingEventProcessorFormat::default_();
    }
    throw BridgeError(BridgeError::unknownValue, "the logging format");
}

}  // namespace

BridgingLoggingEventProcessor::BridgingLoggingEventProcessor(BridgedLoggingEventProcessorFormat format,
                                                             Formatter formatter)
    : BridgingEventProcessor(std::make_shared<LoggingEventProcessor>(libraryFormat(format, std::move(formatter)))) {}
BridgingLoggingEventProcessor::~BridgingLoggingEventProcessor() = default;

}  // namespace corvane
