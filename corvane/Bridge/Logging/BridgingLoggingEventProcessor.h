#pragma once

#include <corvane/Bridge/Session/BridgingEventProcessor.h>
#include <corvane/Export.h>
#include <corvane/Processing/LoggingEventProcessor.h>

#include <functional>
#include <string>

namespace corvane {

/// How the logging processor writes events. Callers see it as `CVLoggingEventProcessorFormat`. The values may not
/// change.
enum class BridgedLoggingEventProcessorFormat : int {
    json = 0,      ///< compact JSON
    custom = 1,    ///< by a formatter of the host's
    default_ = 2,  ///< in the library's own form
};

/// The logging processor for object-facing hosts, which add it like one of their own. Callers see it as
/// `CVLoggingEventProcessor`. Shared by the host.
class CORVANE_EXPORT BridgingLoggingEventProcessor final : public BridgingEventProcessor {
  public:
    /// Turns an event into its line. Called on the session manager's queue; what it throws is logged instead.
    using Formatter = std::function<std::string(const BridgedProcessEvent&)>;

    /// @param formatter for the format `custom`; the others do not use it
    /// Throws `BridgeError`: for an integer that is no format, and for `custom` without a formatter.
    explicit BridgingLoggingEventProcessor(
        BridgedLoggingEventProcessorFormat format = BridgedLoggingEventProcessorFormat::default_,
        Formatter formatter = {});
    BridgingLoggingEventProcessor(const BridgingLoggingEventProcessor&) = default;
    ~BridgingLoggingEventProcessor() override;
};

}  // namespace corvane
