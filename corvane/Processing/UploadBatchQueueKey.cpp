#include <corvane/Processing/UploadBatchQueueKey.h>

namespace corvane {

UploadBatchQueueKeyError::UploadBatchQueueKeyError(Code code)
    : Error("Corvane.UploadBatchQueueKey.Errors", code, "no session is current, so the event belongs to no batch") {}
UploadBatchQueueKeyError::~UploadBatchQueueKeyError() = default;

std::string UploadBatchQueueKey::description() const {
    const std::string session = "sessionID: \"" + sessionID_ + "\"";
    return groupName_ ? "group(" + session + ", groupName: \"" + *groupName_ + "\")" : "session(" + session + ")";
}

}  // namespace corvane
