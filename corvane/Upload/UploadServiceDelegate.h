#pragma once

#include <corvane/Upload/UploadResult.h>

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace corvane {

class UploadServiceType;

/// Whoever keeps the books of an upload service's uploads: the upload manager. The service holds it weakly.
class UploadServiceDelegate {
  public:
    virtual ~UploadServiceDelegate() = default;

    /// Called once for every upload that ended, on the queue that was registered with the service. It runs its database
    /// work where it is called, and reports failures to the log; it does not throw.
    virtual void uploadService(UploadServiceType& service, const UploadResult& result) = 0;

    /// Called in place of the one above for uploads of which several ended together, in their order. Calls it for each
    /// by default.
    virtual void uploadServiceTogether(UploadServiceType& service, const std::vector<UploadResult>& results) {
        for (const auto& result : results) uploadService(service, result);
    }

    /// Called, on the same queue, for an upload whose end the delegate of another process was told of, which keeps the
    /// books of it. Does nothing by default.
    virtual void uploadEndedElsewhere(const UploadResult& /*result*/) {}

    /// Called, on the same queue, when part of an upload's body has gone out: so many bytes of so many. Reports may be
    /// left out while `progressIsWanted` says no. Does nothing by default.
    virtual void uploadDidSend(const std::string& /*identifier*/, std::int64_t /*sent*/, std::int64_t /*expected*/) {}

    /// Called, on the same queue, when all uploads begin to wait because their server cannot be reached, or the way to
    /// it is blocked, and when they go on. Does nothing by default.
    virtual void uploadsAreHeldUp(bool /*lasts*/) {}

    /// Whether anything comes of `uploadDidSend`; it may change at any time. Asked once. By default, with nullptr,
    /// nothing ever does.
    [[nodiscard]] virtual std::shared_ptr<const std::atomic<bool>> progressIsWanted() const noexcept { return nullptr; }
};

}  // namespace corvane
