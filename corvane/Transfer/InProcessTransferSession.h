#pragma once

#include <corvane/Export.h>
#include <corvane/Transfer/TransferSession.h>

#include <filesystem>
#include <memory>
#include <optional>
#include <string>

namespace corvane {

/// The transfer session whose transfers run inside the process, on the library's transfer thread.
///
/// What the configuration says of sharing, relaunching and discretion has no meaning here, and no task of an earlier
/// run is ever listed: a transfer ends with its session or its process, and its owner sends the file again. Redirects
/// are not followed, certificates are verified, and proxies are those of the environment when a task is resumed, except
/// for loopback addresses. Otherwise see `TransferSession`.
class CORVANE_EXPORT InProcessTransferSession final : public TransferSession {
  public:
    /// Opens sessions of this kind, for `TransferSession::setFactory`.
    [[nodiscard]] static Factory factory();

    /// The configuration with its paths made absolute: the host's working directory may change.
    [[nodiscard]] static TransferSessionConfiguration resolved(TransferSessionConfiguration configuration);

    /// An empty `queue` means one of the session's own.
    InProcessTransferSession(const TransferSessionConfiguration& configuration,
                             std::weak_ptr<TransferSessionDelegate> delegate,
                             std::shared_ptr<SerialQueue> queue = nullptr);
    InProcessTransferSession(const InProcessTransferSession&) = delete;
    InProcessTransferSession& operator=(const InProcessTransferSession&) = delete;
    ~InProcessTransferSession() override;

    [[nodiscard]] std::optional<std::string> description() const override;
    void setDescription(std::string description) override;
    std::shared_ptr<TransferTask> uploadTask(TransferRequest request, std::filesystem::path file) override;
    void tasks(Listing listing) override;
    void deliverPendingEvents() override;

  private:
    class Core;
    class UploadTask;

    const std::shared_ptr<Core> core_;
};

}  // namespace corvane
