#pragma once

#include <corvane/Platform/Error.h>

#include <compare>
#include <optional>
#include <string>
#include <utility>

namespace corvane {

/// No key can be made. Domain "Corvane.UploadBatchQueueKey.Errors".
class UploadBatchQueueKeyError : public Error {
  public:
    enum Code {
        invalid = 0,  ///< no session is current: the event belongs to no batch
    };
    explicit UploadBatchQueueKeyError(Code code);
    UploadBatchQueueKeyError(const UploadBatchQueueKeyError&) = default;
    UploadBatchQueueKeyError& operator=(const UploadBatchQueueKeyError&) = default;
    ~UploadBatchQueueKeyError() override;

    [[nodiscard]] Code value() const noexcept { return static_cast<Code>(code()); }
};

/// Which batch an event belongs to: its session's, or its group's within the session. A value.
class UploadBatchQueueKey {
  public:
    using Errors = UploadBatchQueueKeyError;

    [[nodiscard]] static UploadBatchQueueKey session(std::string sessionID) {
        return {std::move(sessionID), std::nullopt};
    }
    [[nodiscard]] static UploadBatchQueueKey group(std::string sessionID, std::string groupName) {
        return {std::move(sessionID), std::move(groupName)};
    }

    [[nodiscard]] const std::string& sessionID() const { return sessionID_; }
    [[nodiscard]] bool isGroup() const { return groupName_.has_value(); }
    /// For the log: `session(sessionID: "...")` or `group(sessionID: "...", groupName: "...")`.
    [[nodiscard]] std::string description() const;

    friend auto operator<=>(const UploadBatchQueueKey&, const UploadBatchQueueKey&) = default;

  private:
    UploadBatchQueueKey(std::string sessionID, std::optional<std::string> groupName)
        : sessionID_(std::move(sessionID)), groupName_(std::move(groupName)) {}

    std::string sessionID_;
    std::optional<std::string> groupName_;
};

}  // namespace corvane
