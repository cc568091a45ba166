#pragma once

namespace corvane {

/// How the logging processor writes events. Callers see it as `CVLoggingEventProcessorFormat`. The values may not
/// change.
enum class BridgedLoggingEventProcessorFormat : int {
    json = 0,      ///< compact JSON
    custom = 1,    ///< by a formatter of the host's
    default_ = 2,  ///< in the library's own form
};

}  // namespace corvane
