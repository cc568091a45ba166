#pragma once

#include <corvane/Platform/Error.h>

#include <string_view>

namespace corvane {

/// An event whose submission failed: it was not accepted, and no processor has got it. Good for the length of the call
/// that it is passed to.
struct RejectedEvent {
    /// Later versions may know more of them.
    enum class Reason {
        noSession,     ///< no session is active
        missingData,   ///< a required property has no data
        encoding,      ///< it cannot be written as JSON
        notRecording,  ///< recording is off
        other,         ///< the host's code, which makes the data, has thrown, or there is no memory
    };

    std::string_view name;
    Reason reason = Reason::other;
    const AnyError& error;  ///< what its completion is called with
};

}  // namespace corvane
