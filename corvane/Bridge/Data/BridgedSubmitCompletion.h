#pragma once

#include <corvane/Bridge/Models/BridgedError.h>
#include <corvane/Bridge/Models/BridgedProcessEvent.h>

#include <functional>

namespace corvane {

/// Called once with the outcome of a submission, on the tracker's queue: the event that was handed on, or the error
/// that stopped it; the other one is nullptr. Both are good for the length of the call. What it throws is logged.
/// Callers see it as `CVSubmitCompletion`.
using BridgedSubmitCompletion = std::function<void(const BridgedProcessEvent* event, const BridgedError* error)>;

}  // namespace corvane
