#pragma once

#include <corvane/Transfer/TransferOutcome.h>
#include <corvane/Transfer/TransferSession.h>

#include <functional>
#include <vector>

namespace corvane {

/// A transfer session's delegate for which several completions at once are cheaper than one after the other. Internal.
class CompletionsTogether {
  public:
    struct Completion {
        std::reference_wrapper<const TransferTask> task;
        std::reference_wrapper<const TransferOutcome> outcome;
    };

    virtual ~CompletionsTogether() = default;

    /// As `taskDidComplete` for each, in this order.
    virtual void tasksDidComplete(const std::vector<Completion>& completions) = 0;
};

}  // namespace corvane
