#pragma once

#include <corvane/Platform/Log.h>
#include <corvane/Transfer/TransferOutcome.h>
#include <corvane/Transfer/TransferSession.h>

#include <atomic>
#include <functional>
#include <memory>
#include <string>
#include <vector>

namespace corvane {

/// What the library's own delegate of a transfer session spares it. A session asks for it where it can; any other kind
/// of session may treat the delegate like a host's. Internal.
class OwnDelegate {
  public:
    struct Completion {
        std::reference_wrapper<const TransferTask> task;
        std::reference_wrapper<const TransferOutcome> outcome;
    };

    virtual ~OwnDelegate() = default;

    /// As `taskDidComplete` for each, in this order: several at once are cheaper than one after the other.
    virtual void tasksDidComplete(const std::vector<Completion>& completions) = 0;

    /// The session holds all uploads to a server ("example.com:443") up because it cannot be reached or the way to it
    /// is blocked, or they go on. Sessions outside the process only. Does nothing by default.
    virtual void serverIsHeldUp(const std::string& /*server*/, bool /*lasts*/) {}

    /// Whether anything comes of telling it how much of a body has gone out, beside a line in the log. Asked once, when
    /// the session is opened, and looked at on any thread; by default, with nullptr, nothing ever does.
    [[nodiscard]] virtual std::shared_ptr<const std::atomic<bool>> progressIsWanted() const noexcept { return nullptr; }
    /// Whether it has a line in the log for that.
    [[nodiscard]] static bool logsProgress() noexcept { return Log::shared().isEnabled(LogLevel::default_); }
};

}  // namespace corvane
