#pragma once

#include <functional>
#include <memory>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

class SerialQueue;
class UploadServiceDelegate;
struct PreparedUploadRequest;

/// Sends prepared requests and tells its delegate how each of them ended.
///
/// Owned by the upload manager. `submit` and `resubmit` are called on the manager's queue and must not wait for
/// another; results arrive at the delegate asynchronously, on the registered queue, never inside a call.
class UploadServiceType {
  public:
    virtual ~UploadServiceType() = default;

    /// Sets the object that receives results, in place of an earlier one. Results that find it gone are dropped.
    virtual void setDelegate(std::weak_ptr<UploadServiceDelegate> delegate) = 0;

    /// The queue on which results are delivered from now on. Called before the first upload.
    virtual void registerAccessQueue(std::shared_ptr<SerialQueue> queue) = 0;

    /// Starts one upload. A request that cannot be signed, or whose file has gone, is not an error here: it goes out as
    /// it can, or ends as a retry.
    virtual void submit(const PreparedUploadRequest& request) = 0;

    /// Starts those of `requests` that are not still running, as transfers of an earlier run may be, in order. An empty
    /// list does nothing. Returns before the uploads have been started.
    virtual void resubmit(std::vector<PreparedUploadRequest> requests) = 0;

    /// Tells, later and on the registered queue, the identifiers of the uploads that are running, also those of earlier
    /// runs and other processes where transfers outlive them. A service that cannot tell never answers, which is what
    /// happens here.
    virtual void inFlight(std::function<void(const std::set<std::string>&)> /*answer*/) {}

    /// Cancels those of `identifiers` that are running, which end as a retry or as they would have, and tells, later
    /// and on the registered queue, which were not. A service that cannot never answers, which is what happens here.
    virtual void cancel(std::set<std::string> /*identifiers*/,
                        std::function<void(const std::set<std::string>& notRunning)> /*answer*/) {}

    /// Whether `identifier` names this service's transfer session. If so, `completion` is kept and called once, on the
    /// main queue, when all events of the session have been delivered; otherwise it is dropped. Callable from any
    /// thread.
    virtual bool shouldResume(std::string_view identifier, std::function<void()> completion) = 0;
};

}  // namespace corvane
