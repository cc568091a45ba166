#pragma once

#include <corvane/Platform/Log.h>
#include <corvane/Transfer/TransferOutcome.h>
#include <corvane/Transfer/TransferSession.h>

#include <functional>
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

    /// Whether anything comes of telling it how much of a body has gone out. The same for every delegate of its kind,
    /// on any thread.
    [[nodiscard]] static bool wantsProgress() noexcept { return Log::shared().isEnabled(LogLevel::default_); }
};

}  // namespace corvane
