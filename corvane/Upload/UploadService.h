#pragma once

#include <corvane/Platform/Lazy.h>
#include <corvane/Platform/Mutex.h>
#include <corvane/Transfer/OwnDelegate.h>
#include <corvane/Transfer/TransferSession.h>
#include <corvane/Upload/Endpoint.h>
#include <corvane/Upload/SignerType.h>
#include <corvane/Upload/UploadResult.h>
#include <corvane/Upload/UploadServiceType.h>

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

namespace corvane {

/// Uploads prepared requests over a background transfer session: signs each body, PUTs its file, and turns the answer
/// into an `UploadResult`. It also answers the host's wake-ups for the session.
///
/// Owned through a shared pointer by the upload manager, which is its delegate. The session is opened by the first call
/// that needs it and kept as long as the service; its callbacks arrive on the registered queue, or on a queue of the
/// session's own when none was registered before. All operations may be called from any thread; none waits for a queue.
/// When the service goes, its transfers inside the process are cancelled without a result, and the completions of
/// wake-ups that still wait are called on the main queue, since nothing would call them later.
///
///     auto service = std::make_shared<UploadService>(endpoint, signer);
///     service->setDelegate(manager);
///     service->registerAccessQueue(queue);
///     service->submit(request);            // later: manager->uploadService(*service, result) on the queue
class UploadService final : public UploadServiceType,
                            public TransferSessionDelegate,
                            public OwnDelegate,
                            public std::enable_shared_from_this<UploadService> {
  public:
    /// The session's identifier, which is its description too. Every service uses this one; the owner key tells their
    /// tasks apart.
    static constexpr std::string_view sessionIdentifier = "com.veskar.corvane.upload-session";

    /// What a status code means for an upload.
    enum class Verdict {
        delivered,     ///< 200-299: the collector has it
        unauthorized,  ///< 401: send it again
        refused,       ///< 400-499 otherwise: give it up
        unavailable,   ///< 429, and 500 or more: send it again
        unhandled,     ///< below 200 and 300-399: give it up
    };
    [[nodiscard]] static Verdict classify(std::int64_t statusCode) noexcept;

    /// The text that tells this endpoint's tasks from those of others, the same in every run: application, documents
    /// directory and endpoint name.
    [[nodiscard]] static std::string ownerKey(const Endpoint& endpoint);

    /// Requires: the service is made with `std::make_shared`.
    /// @param factory opens the session; an empty one means the process's (`makeDefaultTransferSession`). When it
    /// throws, the
    ///        error is logged, nothing is sent, and the next call tries again.
    UploadService(Endpoint endpoint, std::shared_ptr<SignerType> signer, TransferSession::Factory factory = {});
    UploadService(const UploadService&) = delete;
    UploadService& operator=(const UploadService&) = delete;
    ~UploadService() override;

    void setDelegate(std::weak_ptr<UploadServiceDelegate> delegate) override;
    void registerAccessQueue(std::shared_ptr<SerialQueue> queue) override;
    void submit(const PreparedUploadRequest& request) override;
    void resubmit(std::vector<PreparedUploadRequest> requests) override;
    void inFlight(std::function<void(const std::set<std::string>&)> answer) override;
    void cancel(std::set<std::string> identifiers, std::function<void(const std::set<std::string>&)> answer) override;
    bool shouldResume(std::string_view identifier, std::function<void()> completion) override;

    // For the transfer session.
    void taskDidSendBodyData(const TransferTask& task, std::int64_t sent, std::int64_t total,
                             std::int64_t expected) override;
    void taskDidComplete(const TransferTask& task, const std::optional<AnyError>& error,
                         const std::optional<TransferResponse>& response) override;
    void tasksDidComplete(const std::vector<Completion>& completions) override;
    void taskDidEndElsewhere(const TransferTask& task, const std::optional<AnyError>& error,
                             const std::optional<TransferResponse>& response) override;
    void allEventsDelivered() override;
    void serverIsHeldUp(const std::string& server, bool lasts) override;
    [[nodiscard]] std::shared_ptr<const std::atomic<bool>> progressIsWanted() const noexcept override;

  private:
    using Completions = std::vector<std::function<void()>>;

    /// Opens the transfer session, once: under the lock of `lazyURLSession_`. Throws what the factory throws.
    std::shared_ptr<TransferSession> openSession();
    /// The session, opened with the first use; nullptr when it cannot be, which is logged. The next use tries again.
    std::shared_ptr<TransferSession> session() noexcept;
    /// Makes the upload task of a request and resumes it. A signature that cannot be made goes out as its error.
    void startTask(TransferSession& session, const PreparedUploadRequest& request);
    /// Starts what is neither running, as the listing says, nor has ended since the listing was asked for.
    void startMissing(const std::vector<PreparedUploadRequest>& requests,
                      const std::vector<std::shared_ptr<TransferTask>>& tasks);
    /// The text of the signature's header.
    std::string signature(const std::filesystem::path& file);
    /// Asks the host for its headers, and adds those that may be sent.
    void appendHostHeaders(HTTPHeaders& headers) const;
    [[nodiscard]] std::shared_ptr<UploadServiceDelegate> delegate() const;
    /// Remembers the end of an upload for the listings that are under way. Returns who is to be told of it.
    std::shared_ptr<UploadServiceDelegate> noteEnd(const TransferTask& task);
    /// What the end of a task means for its upload; logs it.
    UploadResult result(const TransferTask& task, const std::optional<AnyError>& error,
                        const std::optional<TransferResponse>& response);
    UploadResult result(const std::string& identifier, const std::string& taskID, UploadResponse response);
    /// The task in the log: "<session>.<number>".
    std::string urlSessionTaskID(const TransferTask& task);
    /// Calls and forgets the completions of the platform's wake-ups. On the main queue.
    void invokeBackgroundCompletions(const std::string& session);
    static void invoke(const Completions& completions) noexcept;

    const Endpoint endpoint_;
    const std::shared_ptr<SignerType> signer_;
    const TransferSession::Factory factory_;
    const Lazy<std::shared_ptr<TransferSession>> lazyURLSession_;

    mutable Mutex mutex_;  // never held while calling out
    std::weak_ptr<UploadServiceDelegate> delegate_ CORVANE_GUARDED_BY(mutex_);
    std::shared_ptr<SerialQueue> accessQueue_ CORVANE_GUARDED_BY(mutex_);
    Completions backgroundCompletions_ CORVANE_GUARDED_BY(mutex_);
    // What ended while a retry pass waits for the listing of tasks: an earlier run's upload that has had its outcome is
    // neither in flight then nor to be sent again.
    int pendingListings_ CORVANE_GUARDED_BY(mutex_) = 0;
    std::set<std::string> endedMeanwhile_ CORVANE_GUARDED_BY(mutex_);
};

}  // namespace corvane
