#include <corvane/Tracker/TrackerError.h>

#include <utility>

namespace corvane {

TrackerError::TrackerError(Code code, std::string message, std::vector<MissingData> missingData)
    : Error("Corvane.TrackerError", code, std::move(message)), missingData_(std::move(missingData)) {}
TrackerError::~TrackerError() = default;

TrackerError TrackerError::missing(std::vector<MissingData> missingData) {
    std::string message = "required data is missing:";
    for (const auto& missing : missingData) {
        message += " " + missing.key + " (" + missing.dataName + ")";
    }
    return {eventMissingData, std::move(message), std::move(missingData)};
}

TrackerError TrackerError::withoutSession() {
    return {noSession, "there is no active session", {}};
}

TrackerError TrackerError::withoutRecording() {
    return {notRecording, "recording is off", {}};
}

}  // namespace corvane
